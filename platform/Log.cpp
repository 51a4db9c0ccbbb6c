#include "platform/Log.h"

#include <systemd/sd-journal.h>
#include <syslog.h>

#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <deque>
#include <map>
#include <sstream>

#include "platform/Format.h"

namespace TolkaTouch {

const char* logLevelName(LogLevel level) {
    switch (level) {
    case LogLevel::Debug: return "debug";
    case LogLevel::Default: return "default";
    case LogLevel::Error: return "error";
    }
    return "?";
}

namespace {

// Debug levels per category. Entries are never removed, so a Log may keep a pointer to its flag.
class LevelTable {
public:
    static LevelTable& shared() {
        // Never destroyed: a detached thread (a plug-in's report thread ending) may still log
        // while the process runs its exit handlers.
        static LevelTable& table = *new LevelTable;
        return table;
    }

    const std::atomic<bool>* flag(const std::string& category) {
        std::lock_guard lock(_mutex);
        return &entry(category);
    }

    void set(bool enabled, const std::string& category) {
        std::lock_guard lock(_mutex);
        if (category.empty()) {
            _all = enabled;
            for (auto& [name, flag] : _flags) flag.store(enabled, std::memory_order_relaxed);
        } else {
            entry(category).store(enabled, std::memory_order_relaxed);
        }
    }

private:
    LevelTable() {
        if (const char* env = std::getenv("TOLKATOUCH_DEBUG")) {
            std::string text(env);
            if (text == "1" || text == "all") {
                _all = true;
            } else {
                std::stringstream stream(text);
                std::string name;
                while (std::getline(stream, name, ',')) _fromEnvironment.push_back(name);
            }
        }
    }

    std::atomic<bool>& entry(const std::string& category) {
        auto it = _flags.find(category);
        if (it == _flags.end()) {
            bool enabled = _all;
            for (const auto& name : _fromEnvironment) enabled = enabled || name == category;
            it = _flags.try_emplace(category, enabled).first;
        }
        return it->second;
    }

    std::mutex _mutex;
    bool _all = false;
    std::vector<std::string> _fromEnvironment;
    std::map<std::string, std::atomic<bool>> _flags;
};

int journalPriority(LogLevel level) {
    switch (level) {
    case LogLevel::Debug: return LOG_DEBUG;
    case LogLevel::Default: return LOG_NOTICE;
    case LogLevel::Error: return LOG_ERR;
    }
    return LOG_NOTICE;
}

class JournalSink : public LogSink {
public:
    void write(const LogRecord& record) override {
        sd_journal_send("MESSAGE=%s", record.message.c_str(), "PRIORITY=%d", journalPriority(record.level),
                        "TOLKATOUCH_SUBSYSTEM=%s", record.subsystem.c_str(), "TOLKATOUCH_CATEGORY=%s",
                        record.category.c_str(), nullptr);
    }
};

class StandardErrorSink : public LogSink {
public:
    void write(const LogRecord& record) override {
        std::lock_guard lock(_mutex);
        std::fprintf(stderr, "[%s] %s: %s\n", logLevelName(record.level), record.category.c_str(),
                     record.message.c_str());
    }

private:
    std::mutex _mutex;
};

struct SinkState {
    std::mutex mutex;
    std::shared_ptr<LogSink> custom;
    SystemLog::Destination destination = SystemLog::Destination::Automatic;
    std::shared_ptr<LogSink> journal = std::make_shared<JournalSink>();
    std::shared_ptr<LogSink> standardError = std::make_shared<StandardErrorSink>();

    static SinkState& shared() {
        static SinkState& state = *new SinkState;  // never destroyed, as the level table
        return state;
    }

    std::shared_ptr<LogSink> current() {
        std::lock_guard lock(mutex);
        if (custom) return custom;
        switch (destination) {
        case SystemLog::Destination::Journal: return journal;
        case SystemLog::Destination::StandardError: return standardError;
        case SystemLog::Destination::Automatic: break;
        }
        // A service started by the service manager has its invocation ID; log to the journal then.
        static const bool underServiceManager = std::getenv("INVOCATION_ID") != nullptr;
        return underServiceManager ? journal : standardError;
    }
};

}  // namespace

Log::Log(std::string subsystem, std::string category)
    : _subsystem(std::move(subsystem)),
      _category(std::move(category)),
      _debugEnabled(LevelTable::shared().flag(_category)) {}

void Log::write(LogLevel level, std::string message) const {
    LogRecord record{_subsystem, _category, level, std::move(message)};
    SinkState::shared().current()->write(record);
}

void Log::debug(const char* format, ...) const {
    if (!debugEnabled()) return;
    va_list args;
    va_start(args, format);
    std::string message = formatStringV(format, args);
    va_end(args);
    write(LogLevel::Debug, std::move(message));
}

void Log::log(const char* format, ...) const {
    va_list args;
    va_start(args, format);
    std::string message = formatStringV(format, args);
    va_end(args);
    write(LogLevel::Default, std::move(message));
}

void Log::error(const char* format, ...) const {
    va_list args;
    va_start(args, format);
    std::string message = formatStringV(format, args);
    va_end(args);
    write(LogLevel::Error, std::move(message));
}

namespace SystemLog {

void setDebugEnabled(bool enabled, const std::string& category) { LevelTable::shared().set(enabled, category); }

void setSink(std::shared_ptr<LogSink> sink) {
    auto& state = SinkState::shared();
    std::lock_guard lock(state.mutex);
    state.custom = std::move(sink);
}

void setDefaultDestination(Destination destination) {
    auto& state = SinkState::shared();
    std::lock_guard lock(state.mutex);
    state.destination = destination;
}

void MemorySink::write(const LogRecord& record) {
    std::lock_guard lock(_mutex);
    _records.push_back(record);
}

std::vector<LogRecord> MemorySink::records() const {
    std::lock_guard lock(_mutex);
    return _records;
}

std::vector<std::string> MemorySink::messages() const {
    std::lock_guard lock(_mutex);
    std::vector<std::string> out;
    out.reserve(_records.size());
    for (const auto& r : _records) out.push_back(r.message);
    return out;
}

void MemorySink::clear() {
    std::lock_guard lock(_mutex);
    _records.clear();
}

}  // namespace SystemLog
}  // namespace TolkaTouch
