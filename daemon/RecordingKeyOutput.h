#pragma once
// RecordingKeyOutput: a KeyOutput that keeps every write in memory, for tests.

#include <mutex>
#include <vector>

#include "daemon/KeyOutput.h"

namespace TolkaTouch {

class RecordingKeyOutput : public KeyOutput {
public:
    void write(const KeyWrite& write) override {
        std::lock_guard lock(_mutex);
        _writes.push_back(write);
    }
    std::vector<KeyWrite> writes() const {
        std::lock_guard lock(_mutex);
        return _writes;
    }
    void clear() {
        std::lock_guard lock(_mutex);
        _writes.clear();
    }

private:
    mutable std::mutex _mutex;
    std::vector<KeyWrite> _writes;
};

}  // namespace TolkaTouch
