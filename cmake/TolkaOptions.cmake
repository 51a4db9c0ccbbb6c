# Compile options shared by every target of the project.
add_library(tolka_options INTERFACE)
target_compile_options(tolka_options INTERFACE -Wall -Wextra)
if(TOLKA_WARNINGS_AS_ERRORS)
  target_compile_options(tolka_options INTERFACE -Werror)
endif()
# The public headers (include/tolkatouch/) are for everyone; the source root is on no library's
# include path (see tolka_export_headers).
target_include_directories(tolka_options INTERFACE ${PROJECT_SOURCE_DIR}/include)

# tolka_export_headers(TARGET FOLDER): FOLDER's headers, addressed as "FOLDER/X.h", for TARGET and
# whatever links it, and nothing else of the tree. A folder can include only the folders whose
# libraries it links, so the arrows between folders hold at compile time: algs/ cannot reach up
# into pipeline/, the daemon cannot reach into the plug-in. The build tree holds one small folder
# per exported folder with a link back to the sources.
function(tolka_export_headers target folder)
  set(root ${PROJECT_BINARY_DIR}/include-roots/${folder})
  file(MAKE_DIRECTORY ${root})
  file(CREATE_LINK ${PROJECT_SOURCE_DIR}/${folder} ${root}/${folder} SYMBOLIC)
  target_include_directories(${target} PUBLIC $<BUILD_INTERFACE:${root}>)
endfunction()

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
