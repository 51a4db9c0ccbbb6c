#pragma once
// Subprocess: runs a program of the build for the end-to-end tests, with its standard output and
// error captured to files, and waits for it or signals it.

#include <fcntl.h>
#include <signal.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <fstream>
#include <optional>
#include <sstream>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

extern char** environ;

namespace TolkaTouch::Testing {

inline std::string readWholeFile(const std::string& path) {
    std::ifstream file(path, std::ios::binary);
    std::ostringstream text;
    text << file.rdbuf();
    return text.str();
}

class Subprocess {
public:
    // Starts `arguments` (the first is the program's path) with standard output and error going
    // to the given files and standard input from /dev/null.
    Subprocess(const std::vector<std::string>& arguments, const std::string& stdoutPath, const std::string& stderrPath)
        : _stdoutPath(stdoutPath), _stderrPath(stderrPath) {
        posix_spawn_file_actions_t actions;
        posix_spawn_file_actions_init(&actions);
        posix_spawn_file_actions_addopen(&actions, 0, "/dev/null", O_RDONLY, 0);
        posix_spawn_file_actions_addopen(&actions, 1, stdoutPath.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
        posix_spawn_file_actions_addopen(&actions, 2, stderrPath.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
        std::vector<char*> argv;
        for (const auto& argument : arguments) argv.push_back(const_cast<char*>(argument.c_str()));
        argv.push_back(nullptr);
        // The test runner may block signals in its threads; the child starts with none blocked.
        posix_spawnattr_t attributes;
        posix_spawnattr_init(&attributes);
        sigset_t none;
        sigemptyset(&none);
        posix_spawnattr_setsigmask(&attributes, &none);
        posix_spawnattr_setflags(&attributes, POSIX_SPAWN_SETSIGMASK);
        int result = posix_spawn(&_pid, argv[0], &actions, &attributes, argv.data(), environ);
        posix_spawn_file_actions_destroy(&actions);
        posix_spawnattr_destroy(&attributes);
        if (result != 0) throw std::runtime_error("cannot start " + arguments[0]);
    }

    ~Subprocess() {
        if (!_status) {
            ::kill(_pid, SIGKILL);
            wait(std::chrono::seconds(10));
        }
    }

    Subprocess(const Subprocess&) = delete;
    Subprocess& operator=(const Subprocess&) = delete;

    void signal(int number) { ::kill(_pid, number); }

    // The exit status, or nothing when the process is still running after `limit`.
    std::optional<int> wait(std::chrono::milliseconds limit) {
        auto deadline = std::chrono::steady_clock::now() + limit;
        while (!_status) {
            int status = 0;
            pid_t done = ::waitpid(_pid, &status, WNOHANG);
            if (done == _pid) {
                _status = WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
                break;
            }
            if (std::chrono::steady_clock::now() >= deadline) break;
            std::this_thread::sleep_for(std::chrono::milliseconds(2));
        }
        return _status;
    }

    std::string standardOutput() const { return readWholeFile(_stdoutPath); }
    std::string standardError() const { return readWholeFile(_stderrPath); }

private:
    pid_t _pid = -1;
    std::optional<int> _status;
    std::string _stdoutPath;
    std::string _stderrPath;
};

// Runs to completion (at most `limit`) and answers the exit status, or -1 when it had to be killed.
inline int runToCompletion(const std::vector<std::string>& arguments, const std::string& stdoutPath,
                           const std::string& stderrPath, std::chrono::milliseconds limit = std::chrono::seconds(120)) {
    Subprocess process(arguments, stdoutPath, stderrPath);
    auto status = process.wait(limit);
    return status ? *status : -1;
}

}  // namespace TolkaTouch::Testing
