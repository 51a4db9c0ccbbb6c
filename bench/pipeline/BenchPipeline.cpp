// A full recording as the service keeps it: 1350 image reports (one every 8 ms, a touch coming
// and going) and 20 setting changes.

#include <benchmark/benchmark.h>

#include <cstring>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include <nlohmann/json.hpp>
#include <simdjson.h>

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

// The anchors for the two above, on the same document in the same run. Reading's: simdjson's
// ondemand parser walking every frame, every member and every value of the same bytes (copied
// into simdjson's padded buffer first, as any reader of a byte vector must), strings unescaped and
// numbers converted, keeping nothing. The ondemand parser runs the kernel the compiler flags allow
// (the scalar one for the baseline x86-64 the packages target), the one the reader runs.
void BM_AnchorSimdjsonOndemandParseAndWalk(benchmark::State& state) {
    PipelineRecording recording = fullRecording();
    const std::vector<uint8_t> document = recording.json();
    simdjson::ondemand::parser parser;
    for (auto _ : state) {
        simdjson::padded_string text(reinterpret_cast<const char*>(document.data()), document.size());
        simdjson::ondemand::document tree = parser.iterate(text);
        size_t walked = 0;
        for (simdjson::ondemand::field member : tree.get_object()) {
            if (member.unescaped_key().value() != "Frames") {
                walked += member.value().get_uint64().value();
                continue;
            }
            for (simdjson::ondemand::object frame : member.value().get_array()) {
                for (simdjson::ondemand::field field : frame) {
                    const std::string_view key = field.unescaped_key().value();
                    simdjson::ondemand::value value = field.value();
                    if (key == "Timestamp") {
                        walked += value.get_uint64().value();
                    } else if (key == "Value") {
                        walked += value.raw_json_token().size();
                    } else {
                        walked += value.get_string().value().size();
                    }
                }
            }
        }
        benchmark::DoNotOptimize(walked);
    }
    state.counters["bytes"] = static_cast<double>(document.size());
}
BENCHMARK(BM_AnchorSimdjsonOndemandParseAndWalk)->Unit(benchmark::kMillisecond);

// The same walk through simdjson's DOM parser, which picks the fastest kernel the processor has
// when it runs: the best simdjson does on this machine.
void BM_AnchorSimdjsonDomParseAndWalk(benchmark::State& state) {
    PipelineRecording recording = fullRecording();
    const std::vector<uint8_t> document = recording.json();
    simdjson::dom::parser parser;
    for (auto _ : state) {
        simdjson::padded_string text(reinterpret_cast<const char*>(document.data()), document.size());
        const simdjson::dom::element tree = parser.parse(text);
        size_t walked = tree["Version"].get_uint64().value();
        for (simdjson::dom::object frame : tree["Frames"].get_array()) {
            for (const auto [key, value] : frame) {
                if (key == "Timestamp") {
                    walked += value.get_uint64().value();
                } else if (value.is_string()) {
                    walked += value.get_string().value().size();
                } else {
                    walked += static_cast<size_t>(value.type());
                }
            }
        }
        benchmark::DoNotOptimize(walked);
    }
    state.counters["bytes"] = static_cast<double>(document.size());
}
BENCHMARK(BM_AnchorSimdjsonDomParseAndWalk)->Unit(benchmark::kMillisecond);

// Writing's: nlohmann's own dump(2) of a tree of the same content (the tree built beforehand).
void BM_AnchorNlohmannDump2(benchmark::State& state) {
    PipelineRecording recording = fullRecording();
    const std::vector<uint8_t> document = recording.json();
    const nlohmann::json tree = nlohmann::json::parse(document.begin(), document.end());
    size_t bytes = 0;
    for (auto _ : state) {
        const std::string text = tree.dump(2);
        bytes = text.size();
        benchmark::DoNotOptimize(text.data());
    }
    state.counters["bytes"] = static_cast<double>(bytes);
}
BENCHMARK(BM_AnchorNlohmannDump2)->Unit(benchmark::kMillisecond);

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
