#pragma once
// Log: a handle on the system log for one subsystem and category, with levels debug, default and
// error. Whether debug is on is one atomic load, so callers test it before building costly text.
// Lines go to the journal when running as a service, to standard error otherwise, or to a sink a
// test installs.

#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include <atomic>

namespace TolkaTouch {

enum class LogLevel { Debug, Default, Error };

const char* logLevelName(LogLevel level);

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

    bool debugEnabled() const { return _debugEnabled->load(std::memory_order_relaxed); }

    // printf-style; "%@" of the host's formats is written as "%s" with an object's description.
    void debug(const char* format, ...) const __attribute__((format(printf, 2, 3)));
    void log(const char* format, ...) const __attribute__((format(printf, 2, 3)));  // default level
    void error(const char* format, ...) const __attribute__((format(printf, 2, 3)));
    void write(LogLevel level, std::string message) const;

private:
    std::string _subsystem;
    std::string _category;
    const std::atomic<bool>* _debugEnabled;  // owned by the process-wide level table
};

// Process-wide settings of the system log stand-in.
namespace SystemLog {

// Turns the debug level on or off for one category, or for every category when it is empty.
// The environment variable TOLKATOUCH_DEBUG ("1" or "all", or a comma-separated list of
// categories) sets the starting levels.
void setDebugEnabled(bool enabled, const std::string& category = {});

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
