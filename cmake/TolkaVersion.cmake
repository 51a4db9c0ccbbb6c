# The version both programs print: the project's, plus the revision of the checkout it was
# configured from (git describe), when there is one.
find_package(Git QUIET)
set(TOLKA_GIT_REVISION "")
if(GIT_FOUND AND EXISTS ${PROJECT_SOURCE_DIR}/.git)
  execute_process(COMMAND ${GIT_EXECUTABLE} describe --always --dirty
                  WORKING_DIRECTORY ${PROJECT_SOURCE_DIR}
                  OUTPUT_VARIABLE TOLKA_GIT_REVISION OUTPUT_STRIP_TRAILING_WHITESPACE ERROR_QUIET)
endif()
configure_file(${PROJECT_SOURCE_DIR}/cmake/Version.h.in ${PROJECT_BINARY_DIR}/generated/tolkatouch/Version.h @ONLY)
target_include_directories(tolka_options INTERFACE ${PROJECT_BINARY_DIR}/generated)
