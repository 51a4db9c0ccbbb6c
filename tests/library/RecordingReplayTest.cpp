// replayDocument: the events of the example documents, line for line as `tolkatouch replay --fast
// --json` prints them, and a one-line error for a document the reader refuses.

#include <gtest/gtest.h>

#include <cstdint>
#include <fstream>
#include <iterator>
#include <sstream>
#include <string>
#include <vector>

#include "tolkatouch/Gesture.h"
#include "tolkatouch/RecordingReplay.h"

namespace TolkaTouch {
namespace {

std::string readFile(const std::string& path) {
    std::ifstream file(path, std::ios::binary);
    std::stringstream text;
    text << file.rdbuf();
    return text.str();
}

std::string replayedLines(const std::string& documentPath) {
    const std::string text = readFile(documentPath);
    const std::vector<uint8_t> document(text.begin(), text.end());
    std::string lines;
    replayDocument(document, [&lines](const HIDEvent& event) { lines += GestureCodec::jsonLine(event) + "\n"; });
    return lines;
}

TEST(RecordingReplayTest, EverydaySessionGivesTheToolsEventLines) {
    EXPECT_EQ(replayedLines(TOLKA_EXAMPLES_DIR "/everyday-session.json"),
              readFile(TOLKA_EXPECTED_DIR "/everyday-session.jsonl"));
}

TEST(RecordingReplayTest, ResetDuringHoldGivesTheToolsEventLines) {
    EXPECT_EQ(replayedLines(TOLKA_EXAMPLES_DIR "/reset-during-hold.json"),
              readFile(TOLKA_EXPECTED_DIR "/reset-during-hold.jsonl"));
}

TEST(RecordingReplayTest, VersionZeroDocumentIsMigratedAndReplayed) {
    EXPECT_EQ(replayedLines(TOLKA_EXAMPLES_DIR "/version0-session.json"),
              readFile(TOLKA_EXPECTED_DIR "/version0-session.jsonl"));
}

TEST(RecordingReplayTest, DocumentThatIsNotJsonThrowsDocumentErrorBeforeAnyEvent) {
    const std::string text = "not a document";
    const std::vector<uint8_t> document(text.begin(), text.end());
    int events = 0;
    EXPECT_THROW(replayDocument(document, [&events](const HIDEvent&) { ++events; }), DocumentError);
    EXPECT_EQ(events, 0);
}

}  // namespace
}  // namespace TolkaTouch
