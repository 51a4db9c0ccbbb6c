#pragma once
// A settings file: one KEY=VALUE a line, as `--set` takes each (blank lines and lines starting
// with # are skipped). `tolkatouch tune --write-settings` writes one; replay, eval and sweep take it
// with --settings, and `tolkatouch prop apply` sets it on the running service.

#include <string>
#include <vector>

namespace TolkaTouch::Tools {

// The file's KEY=VALUE texts in order; ToolError naming the file (and the line) when it cannot be
// read or a line is not KEY=VALUE. The settings themselves are checked where they are used.
std::vector<std::string> readSettingsFile(const std::string& path);

// The files' settings first, in order, then the --set ones, which thus win.
std::vector<std::string> settingsWithFiles(const std::vector<std::string>& files, const std::vector<std::string>& settings);

}  // namespace TolkaTouch::Tools
