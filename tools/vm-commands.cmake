# The subcommands that reach the kernel's input stack: `uhid` (a virtual surface through
# /dev/uhid) and `keys` (key events read back from an input device through libevdev).
pkg_check_modules(TOLKA_TOOLS_EVDEV REQUIRED IMPORTED_TARGET libevdev)
target_sources(tolkatouch PRIVATE
  ${CMAKE_CURRENT_LIST_DIR}/UhidCommand.cpp
  ${CMAKE_CURRENT_LIST_DIR}/VirtualSurface.cpp
  ${CMAKE_CURRENT_LIST_DIR}/KeysCommand.cpp
)
target_link_libraries(tolkatouch PRIVATE PkgConfig::TOLKA_TOOLS_EVDEV)
