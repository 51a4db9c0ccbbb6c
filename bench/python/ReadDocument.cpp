// The anchor of the Python package's loading benchmark: reads a recording document with the C++
// reader (the file's bytes, then PipelineRecording) several times and prints the best time.
//
//   bench_read_document DOCUMENT [runs]   prints "read <frames> frames: best of <runs> <ms> ms"

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <string>

#include "tools/DocumentFile.h"

int main(int argc, char** argv) {
    if (argc < 2) {
        std::fprintf(stderr, "usage: bench_read_document DOCUMENT [runs]\n");
        return 2;
    }
    const int runs = argc > 2 ? std::max(1, std::atoi(argv[2])) : 5;
    double best = 1e300;
    size_t frames = 0;
    for (int run = 0; run < runs; ++run) {
        const auto start = std::chrono::steady_clock::now();
        const TolkaTouch::PipelineRecording recording = TolkaTouch::Tools::loadRecording(argv[1]);
        const std::chrono::duration<double, std::milli> elapsed = std::chrono::steady_clock::now() - start;
        best = std::min(best, elapsed.count());
        frames = recording.frames().size();
    }
    std::printf("read %zu frames: best of %d %.1f ms\n", frames, runs, best);
    return 0;
}
