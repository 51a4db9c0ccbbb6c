#include "daemon/KeyLogOutput.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <stdexcept>

namespace TolkaTouch {

KeyLogOutput::KeyLogOutput(const std::string& path) {
    _fd = ::open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_APPEND | O_CLOEXEC, 0644);
    if (_fd < 0) {
        throw std::runtime_error("cannot open key log " + path + ": " + std::strerror(errno));
    }
}

KeyLogOutput::~KeyLogOutput() {
    if (_fd >= 0) ::close(_fd);
}

void KeyLogOutput::write(const KeyWrite& write) {
    std::string line = describeKeyWrite(write) + "\n";
    // A short or failed write to a test log is not worth stopping the daemon for.
    [[maybe_unused]] ssize_t written = ::write(_fd, line.data(), line.size());
}

}  // namespace TolkaTouch
