#pragma once
// LogArguments: the numbers of one log line, kept as they were passed so that the line is
// formatted only when it is written (a per-frame line that the rate guard folds stays a few bytes
// until a summary needs its text).

#include <cstddef>
#include <cstring>
#include <string>
#include <type_traits>
#include <utility>

#include "platform/Format.h"

namespace TolkaTouch {

// Holds up to kMaxArguments arithmetic values, each as it was passed; text() formats them exactly
// as the line would have been formatted at once.
class LogArguments {
public:
    static constexpr size_t kMaxArguments = 4;

    template <typename... Args>
    static constexpr bool kKeeps = sizeof...(Args) > 0 && sizeof...(Args) <= kMaxArguments &&
                                   ((std::is_arithmetic_v<Args> && sizeof(Args) <= 16) && ...);

    LogArguments() = default;
    template <typename... Args>
    explicit LogArguments(Args... args) : _text(&textOf<Args...>) {
        static_assert(kKeeps<Args...>);
        size_t slot = 0;
        ((std::memcpy(_slots + kSlotSize * slot++, &args, sizeof args)), ...);
    }

    // The line's text for its printf-style `format`.
    std::string text(const char* format) const { return _text ? _text(format, _slots) : std::string(); }

private:
    static constexpr size_t kSlotSize = 16;

    template <typename T>
    static T load(const unsigned char* at) {
        T value;
        std::memcpy(&value, at, sizeof value);
        return value;
    }
    template <typename... Args, size_t... Index>
    static std::string textOf(const char* format, const unsigned char* slots, std::index_sequence<Index...>) {
        return formatString(format, load<Args>(slots + kSlotSize * Index)...);
    }
    template <typename... Args>
    static std::string textOf(const char* format, const unsigned char* slots) {
        return textOf<Args...>(format, slots, std::index_sequence_for<Args...>{});
    }

    std::string (*_text)(const char*, const unsigned char*) = nullptr;
    unsigned char _slots[kMaxArguments * kSlotSize] = {};
};

}  // namespace TolkaTouch
