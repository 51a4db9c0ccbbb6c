// Any bytes as the document tolkatouchd --simulate is given: the feeder either takes it or
// refuses it with one message; it never crashes, however the document nests.

#include <unistd.h>

#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <exception>
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
        SimulationFeeder feeder(path, 1.0f);
    } catch (const std::exception&) {
    }
    return 0;
}
