#include "platform/LogRateGuard.h"

#include <algorithm>
#include <cstdio>

namespace TolkaTouch {

namespace {
constexpr double kNanosecondsPerSecond = 1e9;

double secondsBetween(uint64_t from, uint64_t to) {
    return to > from ? static_cast<double>(to - from) / kNanosecondsPerSecond : 0.0;
}
}  // namespace

void LogRateGuard::refill(State& state, const LogRate& rate, uint64_t now) {
    state.tokens = std::min<double>(rate.burst, state.tokens + secondsBetween(state.refilled, now) * rate.perSecond);
    state.refilled = now;
}

LogRateGuard::Decision LogRateGuard::admit(const void* format, const LogRate& rate, uint64_t now, int level) {
    if (rate.unlimited) return {Verdict::Write};
    auto [it, isNew] = _formats.try_emplace(format);
    State& state = it->second;
    if (isNew) {
        state.tokens = rate.burst;
        state.refilled = now;
    }
    state.rate = rate;
    refill(state, rate, now);
    if (state.tokens >= 1.0) {
        state.tokens -= 1.0;
        if (state.folded == 0) return {Verdict::Write};
        Decision summary{Verdict::Summary, state.folded + 1, secondsBetween(state.firstFolded, now),
                         std::max(state.level, level)};
        state.folded = 0;
        return summary;
    }
    if (state.folded == 0) {
        state.firstFolded = now;
        state.level = level;
    }
    ++state.folded;
    state.level = std::max(state.level, level);
    return {Verdict::Fold};
}

std::vector<LogRateGuard::Pending> LogRateGuard::flush(uint64_t now, bool everything) {
    std::vector<Pending> due;
    for (auto& [format, state] : _formats) {
        if (state.folded == 0) continue;
        refill(state, state.rate, now);
        if (!everything && state.tokens < 1.0) continue;
        if (state.tokens >= 1.0) state.tokens -= 1.0;
        due.push_back({format, state.level, state.folded, secondsBetween(state.firstFolded, now)});
        state.folded = 0;
    }
    return due;
}

std::string foldedSummary(const std::string& lastMessage, uint64_t folded, double seconds) {
    char suffix[96];
    std::snprintf(suffix, sizeof suffix, " (%llu lines like this in %.1f s, this the last)",
                  static_cast<unsigned long long>(folded), seconds);
    return lastMessage + suffix;
}

}  // namespace TolkaTouch
