# Debian packages with CPack's DEB generator, from the install rules of this very build tree:
#   tolkatouch          the service: daemon, plug-in, tool, unit, udev rule, log configuration,
#                       examples; every install rule without a component of its own
#   libtolkatouch-dev   libtolkatouch.so.0, the public headers, pkg-config and CMake package files
#   python3-tolkatouch  the Python module (install component "python"), when the build has one
# Packages hold /usr paths, so they come from a tree configured for the /usr prefix (the release
# preset is); any other tree says so instead of packing paths that would be wrong.
if(NOT CMAKE_INSTALL_PREFIX STREQUAL "/usr")
  add_custom_target(package
    COMMAND ${CMAKE_COMMAND} -E echo
            "packages are built from a tree configured with CMAKE_INSTALL_PREFIX=/usr (the release preset); this one has ${CMAKE_INSTALL_PREFIX}"
    COMMAND ${CMAKE_COMMAND} -E false
    VERBATIM)
  return()
endif()

set(TOLKA_PACKAGING_DIR ${PROJECT_SOURCE_DIR}/packaging/deb)
set(CPACK_PACKAGE_CONTACT "TolkaTouch maintainers <maintainers@users.noreply.c-seed-e53190b6.example>")

# Each package's /usr/share/doc/<package>: the copyright file and a one-entry changelog dated by
# the checkout's last commit (reproducible), compressed as Debian wants it (gzip -9n).
set(TOLKA_CHANGELOG_REVISION "${TOLKA_GIT_REVISION}")
if(NOT TOLKA_CHANGELOG_REVISION)
  set(TOLKA_CHANGELOG_REVISION "of version ${PROJECT_VERSION}")
endif()
set(TOLKA_CHANGELOG_DATE "")
if(GIT_FOUND AND TOLKA_GIT_REVISION)
  execute_process(COMMAND ${GIT_EXECUTABLE} log -1 --format=%aD WORKING_DIRECTORY ${PROJECT_SOURCE_DIR}
                  OUTPUT_VARIABLE TOLKA_CHANGELOG_DATE OUTPUT_STRIP_TRAILING_WHITESPACE ERROR_QUIET)
endif()
if(NOT TOLKA_CHANGELOG_DATE)
  string(TIMESTAMP TOLKA_CHANGELOG_DATE "%a, %d %b %Y %H:%M:%S +0000" UTC)
endif()
find_program(TOLKA_GZIP gzip REQUIRED)
function(tolka_package_docs package component)
  set(TOLKA_DEB_PACKAGE ${package})
  set(directory ${PROJECT_BINARY_DIR}/packaging/${package})
  configure_file(${TOLKA_PACKAGING_DIR}/changelog.in ${directory}/changelog @ONLY)
  execute_process(COMMAND ${TOLKA_GZIP} -9nf ${directory}/changelog COMMAND_ERROR_IS_FATAL ANY)
  install(FILES ${TOLKA_PACKAGING_DIR}/copyright ${directory}/changelog.gz
          DESTINATION ${CMAKE_INSTALL_DATADIR}/doc/${package} COMPONENT ${component})
  if(EXISTS ${TOLKA_PACKAGING_DIR}/${package}.lintian-overrides)
    install(FILES ${TOLKA_PACKAGING_DIR}/${package}.lintian-overrides
            DESTINATION ${CMAKE_INSTALL_DATADIR}/lintian/overrides RENAME ${package} COMPONENT ${component})
  endif()
endfunction()
tolka_package_docs(tolkatouch tolkatouch)
tolka_package_docs(libtolkatouch-dev dev)

# The shipped examples: recordings the tool replays, and the out-of-tree embedding project.
file(GLOB tolka_example_documents ${PROJECT_SOURCE_DIR}/examples/*-session.json ${PROJECT_SOURCE_DIR}/examples/*-session.txt
     ${PROJECT_SOURCE_DIR}/examples/*-hold.json ${PROJECT_SOURCE_DIR}/examples/*-hold.txt)
install(FILES ${tolka_example_documents} DESTINATION ${CMAKE_INSTALL_DATADIR}/doc/tolkatouch/examples COMPONENT tolkatouch)
install(DIRECTORY ${PROJECT_SOURCE_DIR}/examples/embedding
        DESTINATION ${CMAKE_INSTALL_DATADIR}/doc/libtolkatouch-dev/examples COMPONENT dev)

# One package per group; a component this file does not know joins the service's package.
get_cmake_property(CPACK_COMPONENTS_ALL COMPONENTS)
foreach(component IN LISTS CPACK_COMPONENTS_ALL)
  string(TOUPPER ${component} upper)
  if(component STREQUAL "dev")
    set(CPACK_COMPONENT_${upper}_GROUP dev)
  elseif(component STREQUAL "python")
    set(CPACK_COMPONENT_${upper}_GROUP python)
  else()
    set(CPACK_COMPONENT_${upper}_GROUP tolkatouch)
  endif()
endforeach()
set(TOLKA_PACKAGE_GROUPS tolkatouch dev)
if("python" IN_LIST CPACK_COMPONENTS_ALL)
  list(APPEND TOLKA_PACKAGE_GROUPS python)
  tolka_package_docs(python3-tolkatouch python)
endif()

set(CPACK_GENERATOR DEB)
set(CPACK_PACKAGE_NAME tolkatouch)
set(CPACK_PACKAGE_VERSION ${TOLKA_PACKAGE_VERSION})
set(CPACK_PACKAGING_INSTALL_PREFIX /usr)
set(CPACK_STRIP_FILES ON)
set(CPACK_DEB_COMPONENT_INSTALL ON)
set(CPACK_COMPONENTS_GROUPING ONE_PER_GROUP)
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_PACKAGE_VERSION ${TOLKA_PACKAGE_VERSION})
set(CPACK_DEBIAN_PACKAGE_PRIORITY optional)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
# The programs' private libtolkatouch-platform, found by dpkg-shlibdeps in the package itself.
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS_PRIVATE_DIRS ${CMAKE_INSTALL_LIBDIR}/tolkatouch)
set(CPACK_DEBIAN_PACKAGE_CONTROL_STRICT_PERMISSION ON)
set(CPACK_DEBIAN_COMPRESSION_TYPE xz)

set(CPACK_DEBIAN_TOLKATOUCH_PACKAGE_NAME tolkatouch)
set(CPACK_DEBIAN_TOLKATOUCH_PACKAGE_SECTION utils)
# systemd-sysusers makes the service user in postinst.
set(CPACK_DEBIAN_TOLKATOUCH_PACKAGE_DEPENDS "systemd | systemd-standalone-sysusers | systemd-sysusers")
set(CPACK_DEBIAN_TOLKATOUCH_DESCRIPTION "touch surface media keys service
tolkatouchd turns the gestures of the 15-pixel TolkaTouch capacitive surface
(taps and holds on its play/pause and volume zones) into media keys, through
its HID service plug-in; the tolkatouch tool replays, synthesises and inspects
recordings of the surface. The package holds the systemd unit, the udev rule
that hands the surface to the service user, the log configuration and example
recordings.")
configure_file(${TOLKA_PACKAGING_DIR}/conffiles.in ${PROJECT_BINARY_DIR}/packaging/tolkatouch/conffiles @ONLY)
set(CPACK_DEBIAN_TOLKATOUCH_PACKAGE_CONTROL_EXTRA
    ${TOLKA_PACKAGING_DIR}/postinst ${TOLKA_PACKAGING_DIR}/prerm ${TOLKA_PACKAGING_DIR}/postrm
    ${PROJECT_BINARY_DIR}/packaging/tolkatouch/conffiles)

set(CPACK_DEBIAN_DEV_PACKAGE_NAME libtolkatouch-dev)
set(CPACK_DEBIAN_DEV_PACKAGE_SECTION libdevel)
# The shlibs file and the ldconfig trigger of libtolkatouch.so.0, put in by FinishPackages.cmake
# in place of the maintainer scripts calling ldconfig that this CPack writes for a library.
set(CPACK_TOLKA_DEV_CONTROL_DIR ${PROJECT_BINARY_DIR}/packaging/libtolkatouch-dev/control)
file(MAKE_DIRECTORY ${CPACK_TOLKA_DEV_CONTROL_DIR})
file(WRITE ${CPACK_TOLKA_DEV_CONTROL_DIR}/shlibs "libtolkatouch 0 libtolkatouch-dev (>= ${PROJECT_VERSION})\n")
file(WRITE ${CPACK_TOLKA_DEV_CONTROL_DIR}/triggers "activate-noawait ldconfig\n")
set(CPACK_POST_BUILD_SCRIPTS ${PROJECT_SOURCE_DIR}/cmake/FinishPackages.cmake)
# Manual pages compressed, as Debian keeps them (gzip -9n), before the packages are made.
set(CPACK_PRE_BUILD_SCRIPTS ${PROJECT_SOURCE_DIR}/cmake/CompressManPages.cmake)
set(CPACK_DEBIAN_DEV_DESCRIPTION "TolkaTouch recognizer library - development files
libtolkatouch is the TolkaTouch touch recognizer and its recording documents as
one shared library, for programs that embed the recognizer: test rigs, other
daemons, benches. The package holds the library, its C++20 public headers, a
pkg-config file (tolkatouch) and CMake package files (find_package(TolkaTouch)
gives the target TolkaTouch::tolkatouch), and an example project.")

set(CPACK_DEBIAN_PYTHON_PACKAGE_NAME python3-tolkatouch)
set(CPACK_DEBIAN_PYTHON_PACKAGE_SECTION python)
set(CPACK_DEBIAN_PYTHON_DESCRIPTION "TolkaTouch recordings in Python
The tolkatouch Python module reads TolkaTouch recording documents as numpy
arrays, replays them with the recognizer's per-frame numbers as columns,
synthesises recordings and plots them (python3 -m tolkatouch.plot).")
if(TARGET _tolkatouch AND DEFINED TOLKA_PYTHON_INSTALL_DIR)
  # The extension links the service's private libtolkatouch-platform: it finds it in the
  # tolkatouch package's folder, relative to itself, and so depends on that very version.
  file(RELATIVE_PATH tolka_platform_from_python ${CMAKE_INSTALL_PREFIX}/${TOLKA_PYTHON_INSTALL_DIR}/tolkatouch
       ${CMAKE_INSTALL_FULL_LIBDIR}/tolkatouch)
  set_target_properties(_tolkatouch PROPERTIES INSTALL_RPATH "$ORIGIN/${tolka_platform_from_python}")
  # dpkg-shlibdeps cannot see a library private to another package, so the dependencies are
  # written out: the C and C++ runtimes as tolkatouch's own (which it depends on exactly), the
  # interpreter the extension was built for, and the modules the package imports.
  set(CPACK_DEBIAN_PYTHON_PACKAGE_SHLIBDEPS OFF)
  execute_process(COMMAND ${Python3_EXECUTABLE} -c "import sys; print(sys.version_info[0], sys.version_info[1])"
                  OUTPUT_VARIABLE tolka_python OUTPUT_STRIP_TRAILING_WHITESPACE COMMAND_ERROR_IS_FATAL ANY)
  separate_arguments(tolka_python)
  list(GET tolka_python 0 tolka_python_major)
  list(GET tolka_python 1 tolka_python_minor)
  math(EXPR tolka_python_next "${tolka_python_minor} + 1")
  # The modules the package imports: numpy (arrays), matplotlib (plots), plotly (the viewer's page),
  # Dask (evaluate), Optuna (tune); CMA-ES and scikit-learn only for one sampler and one plot.
  set(CPACK_DEBIAN_PYTHON_PACKAGE_RECOMMENDS "python3-cmaes, python3-sklearn")
  set(CPACK_DEBIAN_PYTHON_PACKAGE_DEPENDS
      "tolkatouch (= ${TOLKA_PACKAGE_VERSION}), python3 (>= ${tolka_python_major}.${tolka_python_minor}~), python3 (<< ${tolka_python_major}.${tolka_python_next}), python3-numpy, python3-matplotlib, python3-plotly, python3-dask, python3-distributed, python3-optuna, libc6 (>= 2.34), libgcc-s1 (>= 3.0), libstdc++6 (>= 12)")
endif()

include(CPack)
foreach(group IN LISTS TOLKA_PACKAGE_GROUPS)
  cpack_add_component_group(${group})
endforeach()
