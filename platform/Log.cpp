#include "platform/Log.h"

#include <systemd/sd-journal.h>
#include <syslog.h>

#include <algorithm>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <deque>
#include <map>
#include <sstream>
#include <stdexcept>

#include "platform/Format.h"

namespace TolkaTouch {

const char* logLevelName(LogLevel level) {
    switch (level) {
    case LogLevel::Debug: return "debug";
    case LogLevel::Info: return "info";
    case LogLevel::Default: return "default";
    case LogLevel::Error: return "error";
    case LogLevel::Fault: return "fault";
    }
    return "?";
}

namespace {

constexpr int kDebug = static_cast<int>(LogLevel::Debug);
constexpr int kDefault = static_cast<int>(LogLevel::Default);

// Minimum levels per category. Entries are never removed, so a Log may keep a pointer to its level.
class LevelTable {
public:
    static LevelTable& shared() {
        // Never destroyed: a detached thread (a plug-in's report thread ending) may still log
        // while the process runs its exit handlers.
        static LevelTable& table = *new LevelTable;
        return table;
    }

    const std::atomic<int>* level(const std::string& category) {
        std::lock_guard lock(_mutex);
        return &entry(category);
    }

    void set(int minimum, const std::string& category) {
        std::lock_guard lock(_mutex);
        if (category.empty()) {
            _rest = minimum;
            for (auto& [name, level] : _levels) level.store(minimum, std::memory_order_relaxed);
        } else {
            entry(category).store(minimum, std::memory_order_relaxed);
        }
    }

    std::map<std::string, std::string> names() {
        std::lock_guard lock(_mutex);
        std::map<std::string, std::string> out{{"*", SystemLog::levelName(_rest)}};
        for (const auto& [name, level] : _levels) out[name] = SystemLog::levelName(level.load());
        return out;
    }

private:
    LevelTable() {
        if (const char* env = std::getenv("TOLKATOUCH_DEBUG")) {
            std::string text(env);
            if (text == "1" || text == "all") {
                _rest = kDebug;
            } else {
                std::stringstream stream(text);
                std::string name;
                while (std::getline(stream, name, ',')) _fromEnvironment.push_back(name);
            }
        }
    }

    std::atomic<int>& entry(const std::string& category) {
        auto it = _levels.find(category);
        if (it == _levels.end()) {
            int minimum = _rest;
            for (const auto& name : _fromEnvironment) {
                if (name == category) minimum = kDebug;
            }
            it = _levels.try_emplace(category, minimum).first;
        }
        return it->second;
    }

    std::mutex _mutex;
    int _rest = kDefault;
    std::vector<std::string> _fromEnvironment;
    std::map<std::string, std::atomic<int>> _levels;
};

int journalPriority(LogLevel level) {
    switch (level) {
    case LogLevel::Debug: return LOG_DEBUG;
    case LogLevel::Info: return LOG_INFO;
    case LogLevel::Default: return LOG_NOTICE;
    case LogLevel::Error: return LOG_ERR;
    case LogLevel::Fault: return LOG_CRIT;
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
      _minimum(LevelTable::shared().level(_category)) {}

void Log::write(LogLevel level, std::string message) const {
    if (!enabled(level)) return;
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
    if (!enabled(LogLevel::Default)) return;
    va_list args;
    va_start(args, format);
    std::string message = formatStringV(format, args);
    va_end(args);
    write(LogLevel::Default, std::move(message));
}

void Log::error(const char* format, ...) const {
    if (!enabled(LogLevel::Error)) return;
    va_list args;
    va_start(args, format);
    std::string message = formatStringV(format, args);
    va_end(args);
    write(LogLevel::Error, std::move(message));
}

namespace SystemLog {

void setDebugEnabled(bool enabled, const std::string& category) {
    LevelTable::shared().set(enabled ? kDebug : kDefault, category);
}

void setMinimumLevel(int minimum, const std::string& category) { LevelTable::shared().set(minimum, category); }

std::map<std::string, std::string> minimumLevels() { return LevelTable::shared().names(); }

std::optional<int> levelFromName(const std::string& name) {
    for (int level = kDebug; level <= kLogOff; ++level) {
        if (name == levelName(level)) return level;
    }
    return std::nullopt;
}

const char* levelName(int minimum) {
    return minimum >= kLogOff ? "off" : logLevelName(static_cast<LogLevel>(minimum));
}

void applyConfiguration(const std::string& text) {
    std::vector<std::pair<std::string, int>> settings;
    std::istringstream lines(text);
    std::string line;
    for (int number = 1; std::getline(lines, line); ++number) {
        if (const size_t hash = line.find('#'); hash != std::string::npos) line.erase(hash);
        std::istringstream words(line);
        std::string category, level, extra;
        if (!(words >> category)) continue;
        const bool complete = static_cast<bool>(words >> level) && !(words >> extra);
        const std::optional<int> minimum = complete ? levelFromName(level) : std::nullopt;
        if (!minimum) {
            throw std::invalid_argument("line " + std::to_string(number) +
                                        ": expected a category (or *) and one of debug, info, default, error, "
                                        "fault, off");
        }
        settings.emplace_back(category == "*" ? std::string() : category, *minimum);
    }
    // "*" first, so that a line for one category is not undone by a later "*".
    std::stable_partition(settings.begin(), settings.end(), [](const auto& entry) { return entry.first.empty(); });
    for (const auto& [category, minimum] : settings) setMinimumLevel(minimum, category);
}

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
