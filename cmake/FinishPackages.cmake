# Run by CPack after it wrote the packages (CPACK_POST_BUILD_SCRIPTS). libtolkatouch-dev gets the
# control files Debian wants for a shared library: a shlibs file and an ldconfig trigger, and not
# the postinst/postrm calling ldconfig by hand that CPack writes itself. Packages of earlier
# versions beside them go, so that `apt install ./build/release/tolkatouch_*.deb` finds one.
find_program(TOLKA_DPKG_DEB dpkg-deb REQUIRED)
foreach(package IN LISTS CPACK_PACKAGE_FILES)
  get_filename_component(folder ${package} DIRECTORY)
  get_filename_component(name ${package} NAME)
  string(REGEX REPLACE "_.*" "" package_name ${name})
  file(GLOB earlier ${folder}/${package_name}_*.deb)
  list(REMOVE_ITEM earlier ${CPACK_PACKAGE_FILES})
  if(earlier)
    file(REMOVE ${earlier})
  endif()
endforeach()
foreach(package IN LISTS CPACK_PACKAGE_FILES)
  get_filename_component(name ${package} NAME)
  if(NOT name MATCHES "^libtolkatouch-dev_")
    continue()
  endif()
  set(root ${CPACK_TOPLEVEL_DIRECTORY}/finish/libtolkatouch-dev)
  file(REMOVE_RECURSE ${root})
  get_filename_component(parent ${root} DIRECTORY)
  file(MAKE_DIRECTORY ${parent})
  execute_process(COMMAND ${TOLKA_DPKG_DEB} --raw-extract ${package} ${root} COMMAND_ERROR_IS_FATAL ANY)
  file(REMOVE ${root}/DEBIAN/postinst ${root}/DEBIAN/postrm)
  file(COPY ${CPACK_TOLKA_DEV_CONTROL_DIR}/shlibs ${CPACK_TOLKA_DEV_CONTROL_DIR}/triggers
       DESTINATION ${root}/DEBIAN FILE_PERMISSIONS OWNER_READ OWNER_WRITE GROUP_READ WORLD_READ)
  execute_process(COMMAND ${TOLKA_DPKG_DEB} --root-owner-group -Zxz --build ${root} ${package}
                  OUTPUT_QUIET COMMAND_ERROR_IS_FATAL ANY)
  file(REMOVE_RECURSE ${root})
endforeach()
