#include "platform/Trace.h"

#include <sys/sdt.h>

#include <atomic>

namespace TolkaTouch::Trace {

namespace {
std::mutex sinkMutex;
std::shared_ptr<Sink> installedSink;
std::atomic<bool> haveSink{false};
}  // namespace

void point(uint32_t code, uint64_t arg1, uint64_t arg2, uint64_t arg3, uint64_t arg4) {
    STAP_PROBE5(tolkatouch, trace, code, arg1, arg2, arg3, arg4);
    if (!haveSink.load(std::memory_order_acquire)) return;
    std::shared_ptr<Sink> sink;
    {
        std::lock_guard lock(sinkMutex);
        sink = installedSink;
    }
    if (sink) sink->record(Record{code, arg1, arg2, arg3, arg4});
}

void setSink(std::shared_ptr<Sink> sink) {
    std::lock_guard lock(sinkMutex);
    installedSink = std::move(sink);
    haveSink.store(installedSink != nullptr, std::memory_order_release);
}

void MemorySink::record(const Record& record) {
    std::lock_guard lock(_mutex);
    _records.push_back(record);
}

std::vector<Record> MemorySink::records() const {
    std::lock_guard lock(_mutex);
    return _records;
}

void MemorySink::clear() {
    std::lock_guard lock(_mutex);
    _records.clear();
}

}  // namespace TolkaTouch::Trace
