#pragma once
// Runs a module of the tolkatouch Python package in place of this program (python3 -m MODULE),
// the package looked for beside the program in the build tree (<build>/tools/tolkatouch and
// <build>/python/tolkatouch), then in the system's Python path.

#include <string>
#include <vector>

namespace TolkaTouch::Tools {

// Execs /usr/bin/python3 -m module arguments...; the module names itself `program` in its usage
// and errors (through the environment variable programVariable). Throws ToolError if it cannot.
[[noreturn]] void execPythonModule(const std::string& module, const std::vector<std::string>& arguments,
                                   const char* programVariable, const char* program);

}  // namespace TolkaTouch::Tools
