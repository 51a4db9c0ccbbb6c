// Any bytes as the document tolkatouchd --simulate is given: the feeder either refuses it with one
// message, or plays it to its end or to the frame that does not read, which it names in one
// message; it never crashes or hangs, however the document nests. The pace is as fast as the
// float allows, so no recorded pause is waited for.

#include <unistd.h>

#include <condition_variable>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <exception>
#include <mutex>
#include <string>

#include "daemon/SimulationFeeder.h"

using namespace TolkaTouch;

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    static const std::string path = "/tmp/fuzz-simulation-feeder-" + std::to_string(::getpid()) + ".json";
    std::FILE* file = std::fopen(path.c_str(), "wb");
    if (file == nullptr) return 0;
    std::fwrite(data, 1, size, file);
    std::fclose(file);
    try {
        SimulationFeeder feeder(path, 3.0e38f);
        std::mutex mutex;
        std::condition_variable ended;
        bool done = false;
        const auto end = [&] {
            std::lock_guard lock(mutex);
            done = true;
            ended.notify_all();
        };
        SimulationFeeder::Target target;
        target.writeReport = [](const uint8_t*, size_t, uint64_t) {};
        target.applySetting = [](const std::string&, const PropertyValue&) {};
        target.finished = end;
        target.failed = [&](const std::string&) { end(); };
        feeder.start(std::move(target));
        std::unique_lock lock(mutex);
        ended.wait(lock, [&] { return done; });
    } catch (const std::exception&) {
    }
    return 0;
}
