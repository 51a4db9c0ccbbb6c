#pragma once
// Log: a handle on the system log for one subsystem and category, with levels debug, default and
// error. Which levels are kept is the host's: a minimum level per category (debug, info, default,
// error, fault, or off), set from a configuration, the command line or at run time. Whether a
// level is on is one atomic load, so callers test it before building costly text. Lines go to the
// journal when running as a service, to standard error otherwise, or to a sink a test installs.

#include <map>
#include <memory>
#include <optional>
#include <mutex>
#include <string>
#include <vector>

#include <atomic>

namespace TolkaTouch {

enum class LogLevel { Debug, Info, Default, Error, Fault };

const char* logLevelName(LogLevel level);

// A category's minimum level: the levels kept are this one and those above it; kLogOff keeps none.
inline constexpr int kLogOff = static_cast<int>(LogLevel::Fault) + 1;

struct LogRecord {
    std::string subsystem;
    std::string category;
    LogLevel level;
    std::string message;
    bool operator==(const LogRecord&) const = default;
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
    void debug(const char* format, ...) const __attribute__((format(printf, 2, 3)));
    void log(const char* format, ...) const __attribute__((format(printf, 2, 3)));  // default level
    void error(const char* format, ...) const __attribute__((format(printf, 2, 3)));
    void write(LogLevel level, std::string message) const;

private:
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

// Applies a log configuration: one "CATEGORY LEVEL" per line ("*" for every category), "#"
// comments and blank lines allowed. Throws std::invalid_argument naming the first line that does
// not read; nothing is applied then.
void applyConfiguration(const std::string& text);

// Where lines go: a sink of the caller's, or the default (journal or standard error) when null.
void setSink(std::shared_ptr<LogSink> sink);

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
