// replay-events DOCUMENT: replays a recording document through libtolkatouch and prints each
// event as one JSON line, exactly as `tolkatouch replay --fast --json DOCUMENT` prints it.

#include <cerrno>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <exception>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include <tolkatouch/Gesture.h>
#include <tolkatouch/RecordingReplay.h>

namespace {

// A message may quote the document: its control characters are shown as \xNN, never sent to the
// terminal as they are.
std::string printable(const std::string& text) {
    std::string shown;
    for (const unsigned char c : text) {
        if (c < 0x20 || c == 0x7f) {
            char escaped[8];
            std::snprintf(escaped, sizeof escaped, "\\x%02x", c);
            shown += escaped;
        } else {
            shown += static_cast<char>(c);
        }
    }
    return shown;
}

}  // namespace

int main(int argc, char** argv) {
    if (argc != 2) {
        std::fprintf(stderr, "usage: replay-events DOCUMENT\n");
        return 2;
    }
    const std::string path = argv[1];
    std::ifstream file(path, std::ios::binary);
    if (!file) {
        std::fprintf(stderr, "replay-events: %s: %s\n", printable(path).c_str(), std::strerror(errno));
        return 1;
    }
    const std::vector<uint8_t> document{std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};

    try {
        TolkaTouch::replayDocument(document, [](const TolkaTouch::HIDEvent& event) {
            std::puts(TolkaTouch::GestureCodec::jsonLine(event).c_str());
        });
    } catch (const std::exception& error) {
        std::fflush(stdout);
        std::fprintf(stderr, "replay-events: %s: %s\n", printable(path).c_str(), printable(error.what()).c_str());
        return 1;
    }
    return 0;
}
