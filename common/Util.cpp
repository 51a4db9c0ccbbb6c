#include "common/Util.h"

#include <cinttypes>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <mutex>
#include <sstream>
#include <stdexcept>

#include <fmt/format.h>

#include "platform/Hex.h"
#include "platform/HostClock.h"

namespace TolkaTouch::Util {

namespace {

// The host clock's timebase never changes while the process runs, so it is read once, by
// whichever conversion comes first, from whatever thread.
std::once_flag timebaseOnce;
Timebase cachedTimebase;

const Timebase& timebase() {
    std::call_once(timebaseOnce, [] { cachedTimebase = Host::timebase(); });
    return cachedTimebase;
}

// The multiplication wraps in 64 bits before the division truncates; recorded time stamps
// depend on exactly this order, so no wider intermediate is used.
uint64_t scale(uint64_t value, uint32_t multiplier, uint32_t divisor) {
    if (divisor == 0) return 0;
    return (uint64_t{multiplier} * value) / divisor;
}

}  // namespace

uint64_t machTimeFromNanoseconds(uint64_t nanoseconds) {
    const Timebase& base = timebase();
    return scale(nanoseconds, base.denominator, base.numerator);
}

uint64_t nanosecondsFromMachTime(uint64_t ticks) {
    const Timebase& base = timebase();
    return scale(ticks, base.numerator, base.denominator);
}

std::string hexStringFromBytes(const std::vector<uint8_t>& bytes) {
    // The trailing space is part of the format: readers split the text at whitespace.
    return Hex::text(bytes, Hex::Spacing::AfterEach);
}

std::vector<uint8_t> bytesFromHexString(const std::string* text) {
    static const std::string empty;
    return bytesFromHexString(text ? *text : empty);
}

std::vector<uint8_t> bytesFromHexString(const std::string& text) {
    std::vector<uint8_t> bytes;
    std::istringstream stream(text);
    stream >> std::hex;
    unsigned short value = 0;
    // A token that does not read (end of text, no leading hex digit, beyond 16 bits) ends the
    // parse with what was gathered so far; only a readable value that is not a byte is an error.
    while (stream >> value) {
        if (value >= 256) throw std::invalid_argument("invalid hex string");
        bytes.push_back(static_cast<uint8_t>(value));
    }
    return bytes;
}

bool stripDomainFromKey(std::string& key, const std::string& domain) {
    const std::string prefix = domain + ".";
    // Compares like strncmp: a key shorter than the prefix ends at its terminating zero and
    // cannot match.
    if (std::strncmp(key.c_str(), prefix.c_str(), prefix.size()) != 0) return false;
    key.erase(0, prefix.size());
    return true;
}

namespace {

[[noreturn]] void failPixelLetterAssertion() {
    std::fprintf(stderr, "Assertion failed: (%s), function %s, file %s, line %d.\n", "c>='A' && c<='O'",
                 "stringFromImage", "Util", 42);
    std::abort();
}

// One pixel's field: the reading right-aligned in half the run's width, then padded to the run's
// width. A reading wider than the run still gets (its excess) spaces after it, because a negative
// field width pads on the left-aligned side; the layout of diagnostics depends on this.
void appendPixelField(std::string& body, intmax_t value, int runLength) {
    const std::string number = fmt::format("{:>{}}", value, runLength / 2);
    body += number;
    body.append(static_cast<size_t>(std::abs(runLength - static_cast<int>(number.size()))), ' ');
}

}  // namespace

std::string stringFromImage(const InputReport::Image& image, bool useRawPixels) {
    std::string body;
    for (const char* row : kImageLayout) {
        int runLength = 0;
        char previous = '\0';
        for (const char* p = row;; ++p) {
            const char c = *p;
            if (c == '\0') break;  // a run not closed by a space would be dropped; the template has none
            if (c != ' ') {
                ++runLength;
                previous = c;
                continue;
            }
            if (previous != '\0') {
                if (previous < 'A' || previous > 'O') failPixelLetterAssertion();
                const size_t index = static_cast<size_t>(previous - 'A');
                const intmax_t value = useRawPixels ? intmax_t{image.rawPixels[index]} : intmax_t{image.pixels[index]};
                appendPixelField(body, value, runLength);
            } else {
                body += ' ';
            }
            runLength = 0;
            previous = '\0';
        }
        body += '\n';
    }
    return fmt::format("# Image frame {}    time {} ms\n\n{}", image.frameNumber, image.timeMs, body);
}

}  // namespace TolkaTouch::Util
