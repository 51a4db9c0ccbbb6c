# Compile options shared by every target of the project.
add_library(tolka_options INTERFACE)
target_compile_options(tolka_options INTERFACE -Wall -Wextra)
if(TOLKA_WARNINGS_AS_ERRORS)
  target_compile_options(tolka_options INTERFACE -Werror)
endif()
target_include_directories(tolka_options INTERFACE ${PROJECT_SOURCE_DIR} ${PROJECT_SOURCE_DIR}/include)

# The recognition code's float results are part of its behaviour: the compiler
# must not fuse multiplies and adds of its own accord.
add_library(tolka_exact_float INTERFACE)
target_compile_options(tolka_exact_float INTERFACE -ffp-contract=off)

# tolka_add_test(NAME SOURCES... LIBS ...): one GoogleTest executable, each test its own ctest case.
function(tolka_add_test name)
  cmake_parse_arguments(T "" "" "SOURCES;LIBS;LABELS" ${ARGN})
  add_executable(${name} ${T_SOURCES})
  target_link_libraries(${name} PRIVATE tolka_options ${T_LIBS} GTest::gtest GTest::gtest_main GTest::gmock)
  if(NOT T_LABELS)
    set(T_LABELS unit)
  endif()
  gtest_discover_tests(${name} PROPERTIES LABELS "${T_LABELS}" DISCOVERY_TIMEOUT 60)
endfunction()
