# The packages' version: the project's own at a release (its tag, "v0.1.0", checked out), else the
# project's version plus the checkout's `git describe`, its dashes made dots, as Debian versions
# allow: "0.1.0+daac62a", "0.1.0+v0.1.0.3.g1a2b3c4.dirty". --version prints the same two parts as
# "0.1.0 (daac62a)"; the pkg-config file and the packages carry this form.
set(TOLKA_PACKAGE_VERSION ${PROJECT_VERSION})
if(TOLKA_GIT_REVISION AND NOT TOLKA_GIT_REVISION STREQUAL "v${PROJECT_VERSION}")
  string(REPLACE "-" "." tolka_revision_dotted "${TOLKA_GIT_REVISION}")
  string(APPEND TOLKA_PACKAGE_VERSION "+${tolka_revision_dotted}")
endif()
