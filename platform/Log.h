#pragma once
// Log: a handle on the system log for one subsystem and category, with levels debug, default and
// error. Which levels are kept is the host's: a minimum level per category (debug, info, default,
// error, fault, or off), set from a configuration, the command line or at run time. Whether a
// level is on is one atomic load, so callers test it before building costly text. Lines go to the
// journal when running as a service, to standard error otherwise, or to a sink a test installs.
// On the way to the journal or standard error of a service a rate guard per message format
// (LogRateGuard) folds a format that repeats quickly into one summary line a second. A folded
// line is kept, for the summary that will end with its text, in storage its format reuses: as its
// numbers when its arguments are numbers (formatted only if a summary is written), else as its
// text formatted on the stack. A line written every frame allocates nothing while it folds.

#include <atomic>
#include <cstdint>
#include <cstring>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <type_traits>
#include <utility>
#include <vector>

#include "platform/LogArguments.h"
#include "platform/LogRateGuard.h"

namespace TolkaTouch {

enum class LogLevel { Debug, Info, Default, Error, Fault };

const char* logLevelName(LogLevel level);

// A category's minimum level: the levels kept are this one and those above it; kLogOff keeps none.
inline constexpr int kLogOff = static_cast<int>(LogLevel::Fault) + 1;

// A printf-style format and the place in the source that wrote it (the caller's, not the log's).
// The compiler's builtins stand in for std::source_location, which the clang of the fuzz build
// does not have.
struct LogFormat {
    LogFormat(const char* format, const char* file = __builtin_FILE(), unsigned line = __builtin_LINE(),
              const char* function = __builtin_FUNCTION())
        : text(format), file(file), line(line), function(function) {}
    const char* text;
    const char* file;
    unsigned line;
    const char* function;
};

// What the host knows about the line's thread when it was written: the device whose report it is
// handling (its node and service number) and the report's frame number. Empty when unknown.
struct LogContext {
    std::string device;
    std::optional<uint32_t> service;
    std::optional<uint64_t> frame;
};

struct LogRecord {
    LogRecord() = default;
    LogRecord(std::string subsystem, std::string category, LogLevel level, std::string message)
        : subsystem(std::move(subsystem)), category(std::move(category)), level(level), message(std::move(message)) {}

    std::string subsystem;
    std::string category;
    LogLevel level = LogLevel::Default;
    std::string message;
    // Where it came from, for the journal's fields; not part of what was logged.
    const char* format = nullptr;
    const char* file = nullptr;  // relative to the source tree when built in it
    uint32_t line = 0;
    const char* function = nullptr;
    LogContext context;
    uint64_t folded = 0;  // a summary of this many lines of its format (the rate guard's), else 0

    // Equal when the same thing was logged: the same subsystem, category, level and text.
    bool operator==(const LogRecord& other) const {
        return subsystem == other.subsystem && category == other.category && level == other.level &&
               message == other.message;
    }
};

class LogSink {
public:
    virtual ~LogSink() = default;
    virtual void write(const LogRecord& record) = 0;
};

class Log {
public:
    Log(std::string subsystem, std::string category);

    const std::string& subsystem() const { return _subsystem; }
    const std::string& category() const { return _category; }

    bool enabled(LogLevel level) const { return static_cast<int>(level) >= _minimum->load(std::memory_order_relaxed); }
    bool debugEnabled() const { return enabled(LogLevel::Debug); }

    // printf-style; "%@" of the host's formats is written as "%s" with an object's description.
    // Nothing is formatted for a level that is off.
    template <typename... Args>
    void debug(LogFormat format, Args... args) const {
        if (enabled(LogLevel::Debug)) emitLine(LogLevel::Debug, format, args...);
    }
    template <typename... Args>
    void info(LogFormat format, Args... args) const {
        if (enabled(LogLevel::Info)) emitLine(LogLevel::Info, format, args...);
    }
    template <typename... Args>
    void log(LogFormat format, Args... args) const {  // default level
        if (enabled(LogLevel::Default)) emitLine(LogLevel::Default, format, args...);
    }
    template <typename... Args>
    void error(LogFormat format, Args... args) const {
        if (enabled(LogLevel::Error)) emitLine(LogLevel::Error, format, args...);
    }
    template <typename... Args>
    void fault(LogFormat format, Args... args) const {
        if (enabled(LogLevel::Fault)) emitLine(LogLevel::Fault, format, args...);
    }
    // A line already formatted; its format, for the rate guard, is its call site.
    void write(LogLevel level, std::string message, const char* file = __builtin_FILE(),
               unsigned line = __builtin_LINE(), const char* function = __builtin_FUNCTION()) const;

private:
    // Numbers only: kept as they are, formatted when the line is written. Anything else (a
    // string): formatted now.
    template <typename... Args>
    void emitLine(LogLevel level, const LogFormat& format, Args... args) const {
        if constexpr (LogArguments::kKeeps<Args...>) {
            emitKept(level, format, LogArguments(args...));
        } else {
            emitFormatted(level, &format, args...);
        }
    }
    // Formats the arguments after `format` (printf-style, promoted as for any variadic call).
    void emitFormatted(LogLevel level, const LogFormat* format, ...) const;
    void emitKept(LogLevel level, const LogFormat& format, const LogArguments& arguments) const;
    void emit(LogLevel level, const LogFormat& format, std::string_view message) const;
    void emit(LogLevel level, const LogFormat& format, const std::string_view* message,
              const LogArguments* arguments) const;

    std::string _subsystem;
    std::string _category;
    const std::atomic<int>* _minimum;  // owned by the process-wide level table
};

// Process-wide settings of the system log stand-in.
namespace SystemLog {

// Turns the debug level on (minimum debug) or off (minimum default) for one category, or for every
// category when it is empty. The environment variable TOLKATOUCH_DEBUG ("1" or "all", or a
// comma-separated list of categories) turns it on from the start.
void setDebugEnabled(bool enabled, const std::string& category = {});

// The minimum level of one category, or of every category when it is empty (which also becomes
// the level of categories not seen yet).
void setMinimumLevel(int minimum, const std::string& category = {});
// Every category seen so far with its minimum level's name, and "*" with the level of the rest.
std::map<std::string, std::string> minimumLevels();
// "debug", "info", "default", "error", "fault", "off"; nothing for any other word.
std::optional<int> levelFromName(const std::string& name);
const char* levelName(int minimum);

// Applies a log configuration: one "CATEGORY LEVEL" per line ("*" for every category), and for
// the rate guard "rate [CATEGORY] BURST PER_SECOND [FORMAT START]" or "rate [CATEGORY] unlimited
// [FORMAT START]" (every category, one category, or the formats of one category that start with
// the given text); "#" comments and blank lines allowed. Rates not given are the default (a burst
// of 10, then 1 line a second per format). Throws std::invalid_argument naming the first line
// that does not read; nothing is applied then. The rate rules replace those applied before, unless
// `keepRates` (for overrides on top of a configuration file).
void applyConfiguration(const std::string& text, bool keepRates = false);

void setRate(const LogRateRule& rule);
LogRate rate(const std::string& category, const char* format = nullptr);
void resetRates();  // no rules: the default for every format

// Writes the summaries of lines folded and not yet summarised: those due now (the host calls this
// about once a second, so that a burst that stops is still counted soon), or all (at exit).
void flushFolded(bool everything = false);

// Where lines go: a sink of the caller's, or the default (journal or standard error) when null.
// A sink of the caller's gets every line unless it asks for the rate guard.
void setSink(std::shared_ptr<LogSink> sink, bool rateGuarded = false);

// Sees every line the levels keep, before the rate guard (for live followers); null removes it.
void setObserver(std::shared_ptr<LogSink> observer);

// The journal's MESSAGE_ID of a line: the same for every line of one message format.
std::string messageId(const LogRecord& record);

// One "rate" line of the configuration after the word "rate", or nothing when it does not read.
std::optional<LogRateRule> parseRateLine(const std::string& text);

// The calling thread's context, given to each line it writes until changed. Copied into storage
// the thread keeps, so that setting it once a report allocates nothing after the first time.
void setThreadContext(const LogContext& context);
void clearThreadContext();

// Whether the rate guard stands before the journal and standard error: off until a service turns
// it on (a tool asked for every description line prints them all).
void setRateGuarded(bool guarded);

enum class Destination { Automatic, Journal, StandardError };
void setDefaultDestination(Destination destination);

// Keeps every line in memory, for tests to read back.
class MemorySink : public LogSink {
public:
    void write(const LogRecord& record) override;
    std::vector<LogRecord> records() const;
    std::vector<std::string> messages() const;  // in order, any level and category
    void clear();

private:
    mutable std::mutex _mutex;
    std::vector<LogRecord> _records;
};

}  // namespace SystemLog
}  // namespace TolkaTouch
