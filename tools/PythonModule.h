#pragma once
// Runs a module of the tolkatouch Python package in place of this program (python3 -m MODULE),
// for the subcommands written in Python. The package is looked for beside the program in the
// build tree (<build>/tools/tolkatouch and <build>/python/tolkatouch), then in the system's Python path.

#include <string>
#include <vector>

namespace TolkaTouch::Tools {

// Replaces the process with /usr/bin/python3 -m tolkatouch.MODULE ARGUMENTS...; the module reads
// its program name for messages from the environment variable named progVariable, set to prog.
// Throws ToolError when the interpreter cannot be started.
[[noreturn]] void execPythonModule(const std::string& module, const std::vector<std::string>& arguments,
                                   const char* progVariable, const std::string& prog);

}  // namespace TolkaTouch::Tools
