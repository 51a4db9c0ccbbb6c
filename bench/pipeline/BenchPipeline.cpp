// A full recording as the service keeps it: 1350 image reports (one every 8 ms, a touch coming
// and going) and 20 setting changes.

#include <benchmark/benchmark.h>

#include <cstring>
#include <memory>
#include <vector>

#include "pipeline/Pipeline.h"
#include "pipeline/PipelineRecording.h"

namespace TolkaTouch {
namespace {

constexpr uint64_t kMaxInputReports = 1350;
constexpr int kStateFrames = 20;

std::vector<uint8_t> imageReport(uint32_t frameNumber) {
    std::vector<uint8_t> bytes(InputReport::Image::kReportLength, 0);
    bytes[0] = InputReport::kImageReportID;
    const uint32_t timeMs = frameNumber * 8;
    std::memcpy(&bytes[1], &frameNumber, 4);
    std::memcpy(&bytes[5], &timeMs, 4);
    // A touch on the middle pixels for 40 frames out of every 120, noise otherwise.
    const bool touching = frameNumber % 120 < 40;
    for (size_t i = 0; i < kPixelCount; ++i) {
        const int16_t reading = static_cast<int16_t>((touching && i >= 6 && i <= 9 ? 900 : 0) + (frameNumber * 7 + i * 13) % 40);
        const uint16_t raw = static_cast<uint16_t>(reading + 3000);
        std::memcpy(&bytes[13 + 2 * i], &raw, 2);
        std::memcpy(&bytes[43 + 2 * i], &reading, 2);
    }
    return bytes;
}

PipelineRecording fullRecording() {
    PipelineRecording recording;
    uint64_t now = 1'000'000'000'000;
    recording.clock.now = [&now] { return now; };
    recording.setMaxFrameCount(kMaxInputReports);
    for (uint32_t frame = 1; frame <= kMaxInputReports; ++frame) {
        if (frame % (kMaxInputReports / kStateFrames) == 0 && frame / (kMaxInputReports / kStateFrames) <= kStateFrames) {
            recording.setState("Algs.HoldTimeoutMilliseconds", PropertyValue(400u + frame));
        }
        const std::vector<uint8_t> report = imageReport(frame);
        recording.handleInputReport(report.data(), report.size());
        now += 8'000'000;
    }
    recording.clock = HostClock{};
    return recording;
}

void BM_WriteDocument(benchmark::State& state) {
    PipelineRecording recording = fullRecording();
    size_t bytes = 0;
    for (auto _ : state) {
        std::vector<uint8_t> document = recording.json();
        bytes = document.size();
        benchmark::DoNotOptimize(document.data());
    }
    state.counters["frames"] = static_cast<double>(recording.frames().size());
    state.counters["bytes"] = static_cast<double>(bytes);
}
BENCHMARK(BM_WriteDocument)->Unit(benchmark::kMillisecond);

void BM_ReadDocument(benchmark::State& state) {
    PipelineRecording recording = fullRecording();
    const std::vector<uint8_t> document = recording.json();
    for (auto _ : state) {
        PipelineRecording read(&document);
        benchmark::DoNotOptimize(read.frames().size());
    }
    state.counters["bytes"] = static_cast<double>(document.size());
}
BENCHMARK(BM_ReadDocument)->Unit(benchmark::kMillisecond);

void BM_CopyRecording(benchmark::State& state) {
    const PipelineRecording recording = fullRecording();
    for (auto _ : state) {
        PipelineRecording copy(recording);
        benchmark::DoNotOptimize(copy.frames().size());
    }
}
BENCHMARK(BM_CopyRecording)->Unit(benchmark::kMicrosecond);

// Steady state on the report thread: the host clock, the frame, the bound of 1350 (with its
// trim every 1350 reports) and the pipeline with the recognizer.
void BM_ReportThroughRecordingAndPipeline(benchmark::State& state) {
    auto pipeline = std::make_shared<Pipeline>();
    PipelineRecording recording;
    recording.pipeline = pipeline;
    recording.setMaxFrameCount(kMaxInputReports);
    std::vector<std::vector<uint8_t>> reports;
    for (uint32_t frame = 1; frame <= 1200; ++frame) reports.push_back(imageReport(frame));
    uint32_t frameNumber = 0;
    for (auto _ : state) {
        std::vector<uint8_t>& report = reports[frameNumber % reports.size()];
        ++frameNumber;
        std::memcpy(&report[1], &frameNumber, 4);
        recording.handleInputReport(report.data(), report.size());
    }
    state.counters["disjoint"] = pipeline->disjointImageCount;
}
BENCHMARK(BM_ReportThroughRecordingAndPipeline)->Unit(benchmark::kNanosecond);

}  // namespace
}  // namespace TolkaTouch

BENCHMARK_MAIN();
