#include "tools/PythonModule.h"

#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <optional>

#include "tools/DocumentFile.h"

namespace TolkaTouch::Tools {

namespace {

// The interpreter the package is built for: Debian's, which has numpy, matplotlib, plotly, Dask and Optuna.
constexpr const char* kPython = "/usr/bin/python3";

// <build>/python when this program runs from a build tree that built the package.
std::optional<std::filesystem::path> buildTreePackageDirectory() {
    std::error_code error;
    const std::filesystem::path self = std::filesystem::read_symlink("/proc/self/exe", error);
    if (error) return std::nullopt;
    const std::filesystem::path directory = self.parent_path().parent_path() / "python";
    if (!std::filesystem::exists(directory / "tolkatouch" / "__init__.py", error)) return std::nullopt;
    return directory;
}

}  // namespace

void execPythonModule(const std::string& module, const std::vector<std::string>& arguments, const char* progVariable,
                      const std::string& prog) {
    if (const auto directory = buildTreePackageDirectory()) {
        std::string path = directory->string();
        if (const char* existing = std::getenv("PYTHONPATH"); existing && *existing) path += std::string(":") + existing;
        ::setenv("PYTHONPATH", path.c_str(), 1);
    }
    ::setenv(progVariable, prog.c_str(), 1);

    std::vector<std::string> words{kPython, "-m", "tolkatouch." + module};
    words.insert(words.end(), arguments.begin(), arguments.end());
    std::vector<char*> argv;
    for (std::string& word : words) argv.push_back(word.data());
    argv.push_back(nullptr);

    std::fflush(stdout);
    ::execv(kPython, argv.data());
    throw ToolError(kPython, std::strerror(errno));
}

}  // namespace TolkaTouch::Tools
