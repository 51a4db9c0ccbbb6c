# The virtual surface behind `tolkatouch uhid`: its requests and answers, without a kernel.
tolka_add_test(VirtualSurfaceTest SOURCES ${CMAKE_CURRENT_LIST_DIR}/VirtualSurfaceTest.cpp
  ${PROJECT_SOURCE_DIR}/tools/VirtualSurface.cpp LIBS tolka_common)
