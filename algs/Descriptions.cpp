#include "algs/Descriptions.h"

#include <iterator>

#include <fmt/format.h>

namespace TolkaTouch {

namespace {

const char* onMark(bool on) { return on ? "<==ON" : ""; }

const char* noiseWord(const FrameSnapshot& frame) { return frame.aboveNoise ? "ABOVENOISE" : "BELOWNOISE"; }

int regionNumber(const FrameSnapshot& frame) { return static_cast<int>(frame.verdict.region); }

// The hand-state summary both lines start with. The active pixel count stands under the label
// "NonActivePixels", as readers of these lines know it.
void appendSummary(fmt::memory_buffer& out, const FrameSnapshot& frame) {
    fmt::format_to(std::back_inserter(out),
                   "ts={:f}, sd={:f}, tsd={:f}, NonActivePixels={}, TimeDurationRatio={:f}, TapSVMScore={:f}, [",
                   static_cast<double>(frame.touchScore), static_cast<double>(frame.strengthRate),
                   static_cast<double>(frame.strengthPerDuration), frame.activePixelCount,
                   static_cast<double>(frame.durationRatio), static_cast<double>(frame.tapScore));
}

void appendPhrase(fmt::memory_buffer& out, const FrameSnapshot& frame) {
    out.push_back(']');
    out.push_back(' ');
    const std::string phrase = touchPhasePhrase(frame);
    out.append(phrase.data(), phrase.data() + phrase.size());
}

}  // namespace

std::string touchPhasePhrase(const FrameSnapshot& frame) {
    const int since = frame.sinceTouchStartMs;
    const int length = frame.touchLengthMs;
    const int region = regionNumber(frame);
    switch (frame.verdict.transition) {
    case Transition::TouchBegan: return fmt::format("STARTTOUCH {}ms ActiveRegion={}", since, region);
    case Transition::Holding:
    case Transition::HoldMoved: return fmt::format("HOLDING {}ms ActiveRegion={}", since, region);
    case Transition::HoldBegan:
    case Transition::HoldRecovered: return fmt::format("STARTHOLD {}ms ActiveRegion={}", since, region);
    default: break;
    }
    if (frame.verdict.holdSuppressed) return fmt::format("SUPPRESSHOLD {}ms ActiveRegion={}", since, region);
    switch (frame.verdict.transition) {
    case Transition::Touching: return fmt::format("TOUCHING {}ms ActiveRegion={}", since, region);
    case Transition::HoldEnded:
        // A hold also ends under a finger that stays, when the timeout is raised past the touch.
        if (frame.touching) return fmt::format("TOUCHING {}ms ActiveRegion={}", since, region);
        return fmt::format("ENDHOLD {}ms ActiveRegion={} {}", length, region, noiseWord(frame));
    case Transition::TapAccepted: return fmt::format("TAP {}ms ActiveRegion={} {}", length, region, noiseWord(frame));
    // The rejected tap alone is timed to now; the other ends to the recorded end of the touch.
    case Transition::TapRejected:
        return fmt::format("SUPPRESSTAP {}ms ActiveRegion={} {}", since, region, noiseWord(frame));
    case Transition::TouchEnded:
        return fmt::format("ENDTOUCH {}ms ActiveRegion={} {}", length, region, noiseWord(frame));
    default: return std::string();
    }
}

std::string touchStateLine(const FrameSnapshot& frame) {
    fmt::memory_buffer out;
    appendSummary(out, frame);
    for (size_t i = 0; i < kPixelCount; ++i) {
        fmt::format_to(std::back_inserter(out), "{}{}={:4} {:4}{}", i == 0 ? "" : ", ", static_cast<char>('A' + i),
                       frame.readings[i], frame.pixelValues[i], onMark(frame.pixelOn[i]));
    }
    appendPhrase(out, frame);
    return fmt::to_string(out);
}

std::string virtualStateLine(const FrameSnapshot& frame) {
    fmt::memory_buffer out;
    appendSummary(out, frame);
    for (size_t i = 0; i < kVirtualPixelCount; ++i) {
        fmt::format_to(std::back_inserter(out), "{}{}={:4}{}", i == 0 ? "" : ", ", virtualPixelName(i),
                       frame.virtualValues[i], onMark(frame.virtualOn[i]));
    }
    appendPhrase(out, frame);
    return fmt::to_string(out);
}

}  // namespace TolkaTouch
