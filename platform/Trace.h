#pragma once
// Trace points: a 32-bit code and four 64-bit arguments, emitted as a USDT probe
// (provider "tolkatouch", name "trace") so they cost next to nothing when nobody traces, and
// handed to a sink a test installs.

#include <cstdint>
#include <memory>
#include <mutex>
#include <vector>

namespace TolkaTouch::Trace {

struct Record {
    uint32_t code;
    uint64_t arg1, arg2, arg3, arg4;
    bool operator==(const Record&) const = default;
};

void point(uint32_t code, uint64_t arg1, uint64_t arg2, uint64_t arg3, uint64_t arg4);

class Sink {
public:
    virtual ~Sink() = default;
    virtual void record(const Record& record) = 0;
};

// Installs a sink (null removes it). The sink must outlive its installation.
void setSink(std::shared_ptr<Sink> sink);

class MemorySink : public Sink {
public:
    void record(const Record& record) override;
    std::vector<Record> records() const;
    void clear();

private:
    mutable std::mutex _mutex;
    std::vector<Record> _records;
};

}  // namespace TolkaTouch::Trace
