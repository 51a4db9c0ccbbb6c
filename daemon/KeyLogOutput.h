#pragma once
// KeyLogOutput: a KeyOutput that appends one line per write ("KEY_VOLUMEUP 1") to a file, in
// place of the virtual keyboard; lets end-to-end tests see the exact key writes of a running
// daemon. Each line is written whole with one write call, so a reader never sees half a line.

#include <string>

#include "daemon/KeyOutput.h"

namespace TolkaTouch {

class KeyLogOutput : public KeyOutput {
public:
    // Throws std::runtime_error with a one-line message when the file cannot be opened.
    explicit KeyLogOutput(const std::string& path);
    ~KeyLogOutput() override;
    KeyLogOutput(const KeyLogOutput&) = delete;
    KeyLogOutput& operator=(const KeyLogOutput&) = delete;

    void write(const KeyWrite& write) override;

private:
    int _fd = -1;
};

}  // namespace TolkaTouch
