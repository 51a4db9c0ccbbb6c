#pragma once
// LogRateGuard: keeps a message format that repeats quickly from flooding the log. Each format
// has a bucket of `burst` lines that refills at `perSecond` lines a second: a line that finds a
// line in the bucket is written as it is; the lines after are folded, and while any are folded the
// next line the bucket allows is a summary of them (how many, and the last one's text) instead.
// So a format writes at most its burst and then `perSecond` lines a second, and no line is lost
// without a count. Time is given by the caller, in nanoseconds of a monotonic clock.

#include <cstdint>
#include <string>
#include <unordered_map>
#include <vector>

namespace TolkaTouch {

struct LogRate {
    uint32_t burst = 10;
    double perSecond = 1.0;
    bool unlimited = false;  // every line written
    bool operator==(const LogRate&) const = default;
};

// A rate guard rule; the most particular one that fits a format is its rate.
struct LogRateRule {
    std::string category;     // empty: every category
    std::string formatStart;  // empty: every format of the category
    LogRate rate;
    bool operator==(const LogRateRule&) const = default;
};

class LogRateGuard {
public:
    enum class Verdict { Write, Fold, Summary };
    struct Decision {
        Verdict verdict;
        uint64_t folded = 0;       // for a summary: the lines it stands for, itself included
        double seconds = 0;        // for a summary: since the first of them
        int level = 0;             // for a summary: the highest level among them
        bool operator==(const Decision&) const = default;
    };
    // A summary of lines folded before a quiet spell, for flush() to write.
    struct Pending {
        const void* format;
        int level;
        uint64_t folded;
        double seconds;
        bool operator==(const Pending&) const = default;
    };

    // The line of `format` at time `now` with this level. A summary stands for the folded lines
    // and this one, whose text is the last value.
    Decision admit(const void* format, const LogRate& rate, uint64_t now, int level);

    // Summaries due at `now` for formats with folded lines (all of them when `everything`, as at exit).
    std::vector<Pending> flush(uint64_t now, bool everything = false);

private:
    struct State {
        double tokens = 0;
        uint64_t refilled = 0;
        uint64_t folded = 0;
        uint64_t firstFolded = 0;
        int level = 0;
        LogRate rate;
    };
    static void refill(State& state, const LogRate& rate, uint64_t now);

    std::unordered_map<const void*, State> _formats;
};

// The summary line of `folded` lines whose last was `lastMessage`, over `seconds`.
std::string foldedSummary(const std::string& lastMessage, uint64_t folded, double seconds);

}  // namespace TolkaTouch
