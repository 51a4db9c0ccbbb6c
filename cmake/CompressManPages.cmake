# Run by CPack on its staging folders before it makes the packages (CPACK_PRE_BUILD_SCRIPTS): the
# manual pages the install rules put there are compressed, reproducibly, as Debian keeps them.
find_program(TOLKA_GZIP gzip REQUIRED)
file(GLOB_RECURSE files LIST_DIRECTORIES false ${CPACK_TEMPORARY_DIRECTORY}/*)
foreach(file IN LISTS files)
  if(file MATCHES "/share/man/man[0-9]/[^/]+$" AND NOT file MATCHES "\\.gz$")
    execute_process(COMMAND ${TOLKA_GZIP} -9nf ${file} COMMAND_ERROR_IS_FATAL ANY)
  endif()
endforeach()
