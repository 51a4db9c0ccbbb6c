# Run by CPack on its staging folders before it makes the packages (CPACK_PRE_BUILD_SCRIPTS): the
# manual pages the install rules put there are compressed, reproducibly, as Debian keeps them.
find_program(TOLKA_GZIP gzip REQUIRED)
file(GLOB_RECURSE pages LIST_DIRECTORIES false ${CPACK_TEMPORARY_DIRECTORY}/*/share/man/man*/*)
foreach(page IN LISTS pages)
  if(NOT page MATCHES "\\.gz$")
    execute_process(COMMAND ${TOLKA_GZIP} -9nf ${page} COMMAND_ERROR_IS_FATAL ANY)
  endif()
endforeach()
