#include "tools/StatsPrinter.h"

#include <gtest/gtest.h>

#include "tools/Replayer.h"
#include "tools/GestureScript.h"
#include "tools/Synthesizer.h"

namespace TolkaTouch::Tools {
namespace {

TEST(StatsPrinterTest, FreshPipelineHasNoNonZeroCounters) {
    const Pipeline pipeline;
    EXPECT_EQ(statsTable(pipeline), "");
    const std::string line = statsJsonLine(pipeline);
    EXPECT_EQ(line.rfind(R"({"stats":{"Dispatched":{)", 0), 0u) << line;
    EXPECT_NE(line.find(R"(},"ResetCount":0,"DisjointImageCount":0})"), std::string::npos) << line;
}

TEST(StatsPrinterTest, TableAlignsTheNonZeroCounters) {
    Replayer replayer(recordingFromSynthesis(synthesize(GestureScript::parse("wait 200ms\ntap volume-up 120ms\nwait 300ms\nreset\nwait 100ms\n"), 1)));
    ReplayOptions fast;
    fast.fast = true;
    replayer.run(fast, [](const HIDEvent&) {});
    EXPECT_EQ(statsTable(replayer.pipeline()),
              "ResetCount          1\n"
              "DisjointImageCount  1\n"
              "numTaps             1\n"
              "numVolumeUp         1\n");
}

}  // namespace
}  // namespace TolkaTouch::Tools
