#include "platform/Trace.h"

#include <gtest/gtest.h>

#include <array>
#include <cstdio>
#include <string>

namespace TolkaTouch {
namespace {

class TraceTest : public ::testing::Test {
protected:
    void TearDown() override { Trace::setSink(nullptr); }
};

TEST_F(TraceTest, MemorySinkKeepsEveryPointInOrderWithAllItsArguments) {
    auto sink = std::make_shared<Trace::MemorySink>();
    Trace::setSink(sink);
    Trace::point(0x2B150180, 1, 2, 3, 4);
    Trace::point(0x2B15018C, UINT64_MAX, 0, 0, 0x8000000000000000ull);
    const std::vector<Trace::Record> expected{
        {0x2B150180, 1, 2, 3, 4},
        {0x2B15018C, UINT64_MAX, 0, 0, 0x8000000000000000ull},
    };
    EXPECT_EQ(sink->records(), expected);
}

TEST_F(TraceTest, PointsWithoutASinkAreNotKept) {
    auto sink = std::make_shared<Trace::MemorySink>();
    Trace::point(0x2B150181, 1, 1, 1, 1);
    Trace::setSink(sink);
    Trace::point(0x2B150182, 2, 2, 2, 2);
    Trace::setSink(nullptr);
    Trace::point(0x2B150183, 3, 3, 3, 3);
    EXPECT_EQ(sink->records(), (std::vector<Trace::Record>{{0x2B150182, 2, 2, 2, 2}}));
}

TEST_F(TraceTest, ClearingTheMemorySinkForgetsItsRecords) {
    auto sink = std::make_shared<Trace::MemorySink>();
    Trace::setSink(sink);
    Trace::point(0x2B150184, 0, 0, 0, 0);
    sink->clear();
    EXPECT_TRUE(sink->records().empty());
    Trace::point(0x2B150185, 5, 6, 7, 8);
    EXPECT_EQ(sink->records(), (std::vector<Trace::Record>{{0x2B150185, 5, 6, 7, 8}}));
}

// Reads the notes of the built platform library: each trace point must be there as a USDT probe
// that tracing tools can attach to.
TEST_F(TraceTest, PlatformLibraryCarriesTheTolkatouchTraceProbeNote) {
    const std::string command = std::string("'") + TOLKA_READELF + "' -n '" + TOLKA_PLATFORM_LIBRARY + "'";
    FILE* pipe = popen(command.c_str(), "r");
    ASSERT_NE(pipe, nullptr) << command;
    std::string output;
    std::array<char, 4096> buffer;
    for (size_t n; (n = fread(buffer.data(), 1, buffer.size(), pipe)) > 0;) output.append(buffer.data(), n);
    EXPECT_EQ(pclose(pipe), 0) << command;

    const size_t note = output.find("NT_STAPSDT");
    ASSERT_NE(note, std::string::npos) << output;
    const size_t provider = output.find("Provider: tolkatouch\n", note);
    ASSERT_NE(provider, std::string::npos) << output;
    const size_t name = output.find("Name: trace\n", provider);
    ASSERT_NE(name, std::string::npos) << output;
    // The name belongs to that provider's descriptor, not to a later one.
    EXPECT_LT(name, output.find("Provider:", provider + 1)) << output;
}

}  // namespace
}  // namespace TolkaTouch
