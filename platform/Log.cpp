#include "platform/Log.h"

// The journal's fields CODE_FILE, CODE_LINE and CODE_FUNC are the caller's (LogRecord), not this file's.
#define SD_JOURNAL_SUPPRESS_LOCATION
#include <sys/uio.h>
#include <systemd/sd-journal.h>
#include <syslog.h>

#include <algorithm>
#include <cctype>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <deque>
#include <map>
#include <optional>
#include <sstream>
#include <stdexcept>
#include <unordered_map>

#include "platform/Format.h"
#include <time.h>

#ifndef TOLKA_SOURCE_ROOT
#define TOLKA_SOURCE_ROOT ""
#endif

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
        std::vector<std::string> fields;
        fields.reserve(14);
        fields.push_back("MESSAGE=" + record.message);
        fields.push_back("PRIORITY=" + std::to_string(journalPriority(record.level)));
        fields.push_back("SUBSYSTEM=" + record.subsystem);
        fields.push_back("CATEGORY=" + record.category);
        if (record.format) fields.push_back("MESSAGE_ID=" + SystemLog::messageId(record));
        if (record.file) {
            fields.push_back(std::string("CODE_FILE=") + record.file);
            fields.push_back("CODE_LINE=" + std::to_string(record.line));
            if (record.function) fields.push_back(std::string("CODE_FUNC=") + record.function);
        }
        if (!record.context.device.empty()) fields.push_back("DEVICE=" + record.context.device);
        if (record.context.service) fields.push_back("SERVICE=" + std::to_string(*record.context.service));
        if (record.context.frame) fields.push_back("FRAME=" + std::to_string(*record.context.frame));
        if (record.folded) fields.push_back("FOLDED=" + std::to_string(record.folded));
        std::vector<iovec> vector;
        vector.reserve(fields.size());
        for (std::string& field : fields) vector.push_back({field.data(), field.size()});
        sd_journal_sendv(vector.data(), static_cast<int>(vector.size()));
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

uint64_t monotonicNow() {
    timespec now{};
    clock_gettime(CLOCK_MONOTONIC, &now);
    return static_cast<uint64_t>(now.tv_sec) * 1000000000ull + static_cast<uint64_t>(now.tv_nsec);
}

struct SinkState {
    std::mutex mutex;
    std::shared_ptr<LogSink> custom;
    bool customGuarded = false;
    bool automaticGuarded = false;  // a service turns the guard on; a tool prints every line
    std::shared_ptr<LogSink> observer;
    std::atomic<bool> observed{false};
    // The rate guard, its rates, and the last folded line of each format (for a summary written
    // after a quiet spell).
    std::mutex guardMutex;
    LogRateGuard guard;
    std::vector<LogRateRule> rules;
    std::unordered_map<const void*, LogRate> resolved;  // each format's rate, found once
    // The last folded line of each format; kept (not erased) once summarised, so that its strings
    // are reused by the next line folded.
    struct Folded {
        LogRecord record;
        bool pending = false;
        // The line's numbers when its text was not made (record.message is then stale).
        std::optional<LogArguments> arguments;
    };
    std::unordered_map<const void*, Folded> lastFolded;
    SystemLog::Destination destination = SystemLog::Destination::Automatic;
    std::shared_ptr<LogSink> journal = std::make_shared<JournalSink>();
    std::shared_ptr<LogSink> standardError = std::make_shared<StandardErrorSink>();

    static SinkState& shared() {
        static SinkState& state = *new SinkState;  // never destroyed, as the level table
        return state;
    }

    // The sink and whether the rate guard stands before it.
    std::pair<std::shared_ptr<LogSink>, bool> current() {
        std::lock_guard lock(mutex);
        if (custom) return {custom, customGuarded};
        return {automatic(), automaticGuarded};
    }

    std::shared_ptr<LogSink> automatic() {
        switch (destination) {
        case SystemLog::Destination::Journal: return journal;
        case SystemLog::Destination::StandardError: return standardError;
        case SystemLog::Destination::Automatic: break;
        }
        // A service started by the service manager has its invocation ID; log to the journal then.
        static const bool underServiceManager = std::getenv("INVOCATION_ID") != nullptr;
        return underServiceManager ? journal : standardError;
    }

    // The most particular rule that fits: a category's format start, then the category, then every
    // category; the default when none does.
    LogRate rateFor(const std::string& category, const char* format) const {
        const LogRateRule* best = nullptr;
        auto rank = [](const LogRateRule& rule) { return (rule.category.empty() ? 0 : 1) + (rule.formatStart.empty() ? 0 : 2); };
        for (const LogRateRule& rule : rules) {
            if (!rule.category.empty() && rule.category != category) continue;
            if (!rule.formatStart.empty() && (!format || std::strncmp(format, rule.formatStart.c_str(), rule.formatStart.size()) != 0)) continue;
            if (!best || rank(rule) >= rank(*best)) best = &rule;
        }
        return best ? best->rate : LogRate{};
    }

    LogRate resolvedRate(const std::string& category, const char* format) {
        auto it = resolved.find(format);
        if (it == resolved.end()) it = resolved.emplace(format, rateFor(category, format)).first;
        return it->second;
    }

    // Writes the line made by `makeRecord` through the rate guard (when it stands before the sink).
    // A line the guard folds is not made into a record of its own: its text (or its numbers, not
    // yet formatted) and fields are copied into the kept line of its format, whose strings already
    // have room.
    template <typename MakeRecord, typename KeepFolded>
    void deliver(const char* format, const std::string& category, LogLevel level, const MakeRecord& makeRecord,
                 const KeepFolded& keepFolded) {
        if (observed.load(std::memory_order_relaxed)) {
            std::shared_ptr<LogSink> watcher;
            {
                std::lock_guard lock(mutex);
                watcher = observer;
            }
            if (watcher) watcher->write(makeRecord());
        }
        auto [sink, guarded] = current();
        if (!guarded || !format) {
            sink->write(makeRecord());
            return;
        }
        LogRecord record;
        {
            std::lock_guard lock(guardMutex);
            const LogRateGuard::Decision decision =
                guard.admit(format, resolvedRate(category, format), monotonicNow(), static_cast<int>(level));
            switch (decision.verdict) {
            case LogRateGuard::Verdict::Write: record = makeRecord(); break;
            case LogRateGuard::Verdict::Fold: {
                Folded& kept = lastFolded[format];
                keepFolded(kept);
                kept.pending = true;
                return;
            }
            case LogRateGuard::Verdict::Summary:
                record = makeRecord();
                record.message = foldedSummary(record.message, decision.folded, decision.seconds);
                record.level = static_cast<LogLevel>(decision.level);
                record.folded = decision.folded;
                if (auto it = lastFolded.find(format); it != lastFolded.end()) it->second.pending = false;
                break;
            }
        }
        sink->write(record);
    }

    void flush(bool everything) {
        std::vector<LogRecord> summaries;
        {
            std::lock_guard lock(guardMutex);
            for (const LogRateGuard::Pending& pending : guard.flush(monotonicNow(), everything)) {
                auto it = lastFolded.find(pending.format);
                if (it == lastFolded.end() || !it->second.pending) continue;
                LogRecord record = it->second.record;
                if (it->second.arguments) record.message = it->second.arguments->text(record.format);
                it->second.pending = false;
                record.message = foldedSummary(record.message, pending.folded, pending.seconds);
                record.level = static_cast<LogLevel>(pending.level);
                record.folded = pending.folded;
                summaries.push_back(std::move(record));
            }
        }
        if (summaries.empty()) return;
        auto sink = current().first;
        for (const LogRecord& record : summaries) sink->write(record);
    }
};

thread_local LogContext threadContext;

// The source file as the tree names it, not the build machine's path.
const char* sourceRelative(const char* file) {
    static const size_t rootLength = std::strlen(TOLKA_SOURCE_ROOT);
    if (rootLength > 0 && std::strncmp(file, TOLKA_SOURCE_ROOT, rootLength) == 0) return file + rootLength;
    // A build directory inside the tree names sources relative to itself.
    while (std::strncmp(file, "../", 3) == 0) file += 3;
    return file;
}

}  // namespace

Log::Log(std::string subsystem, std::string category)
    : _subsystem(std::move(subsystem)),
      _category(std::move(category)),
      _minimum(LevelTable::shared().level(_category)) {}

void Log::write(LogLevel level, std::string message, const char* file, unsigned line, const char* function) const {
    if (!enabled(level)) return;
    // The call site's file name stands for its format: one string per place in the source.
    emit(level, LogFormat(file, file, line, function), message);
}

void Log::emitFormatted(LogLevel level, const LogFormat* format, ...) const {
    va_list args;
    va_start(args, format);
    // Most lines fit on the stack and are not copied into a string of their own.
    char small[kFormatOnStack];
    std::string spill;
    emit(level, *format, formatInto(small, spill, format->text, args));
    va_end(args);
}

void Log::emitKept(LogLevel level, const LogFormat& format, const LogArguments& arguments) const {
    emit(level, format, nullptr, &arguments);
}

void Log::emit(LogLevel level, const LogFormat& format, std::string_view message) const {
    emit(level, format, &message, nullptr);
}

// Exactly one of `message` and `arguments` is given.
void Log::emit(LogLevel level, const LogFormat& format, const std::string_view* message,
               const LogArguments* arguments) const {
    const char* file = sourceRelative(format.file);
    // Every field but the text, assigned so that a kept record's strings reuse their storage.
    auto fill = [&](LogRecord& record) {
        record.subsystem = _subsystem;
        record.category = _category;
        record.level = level;
        record.format = format.text;
        record.file = file;
        record.line = format.line;
        record.function = format.function;
        record.context = threadContext;
        record.folded = 0;
    };
    auto makeRecord = [&] {
        LogRecord record;
        fill(record);
        record.message = message ? std::string(*message) : arguments->text(format.text);
        return record;
    };
    auto keepFolded = [&](auto& folded) {
        fill(folded.record);
        if (message) {
            folded.record.message.assign(*message);
            folded.arguments.reset();
        } else {
            folded.arguments = *arguments;
        }
    };
    SinkState::shared().deliver(format.text, _category, level, makeRecord, keepFolded);
}

namespace SystemLog {

std::optional<LogRateRule> parseRateLine(const std::string& text) {
    std::istringstream words(text);
    std::vector<std::string> leading;
    for (std::string word; leading.size() < 3 && words >> word;) leading.push_back(word);
    auto isRate = [](const std::string& word) {
        return word == "unlimited" || (!word.empty() && std::isdigit(static_cast<unsigned char>(word[0])));
    };
    if (leading.empty()) return std::nullopt;
    LogRateRule rule;
    size_t next = 0;
    if (!isRate(leading[0])) {
        rule.category = leading[0] == "*" ? std::string() : leading[0];
        next = 1;
    }
    if (next >= leading.size()) return std::nullopt;
    size_t used = next + 1;
    if (leading[next] == "unlimited") {
        rule.rate = LogRate{0, 0, true};
    } else {
        if (next + 1 >= leading.size()) return std::nullopt;
        try {
            size_t burstEnd = 0, rateEnd = 0;
            const unsigned long burst = std::stoul(leading[next], &burstEnd);
            const double perSecond = std::stod(leading[next + 1], &rateEnd);
            if (burstEnd != leading[next].size() || rateEnd != leading[next + 1].size() || burst < 1 ||
                burst > 1000000 || !(perSecond >= 0.001) || perSecond > 1e6) {
                return std::nullopt;
            }
            rule.rate = LogRate{static_cast<uint32_t>(burst), perSecond, false};
        } catch (const std::exception&) {
            return std::nullopt;
        }
        used = next + 2;
    }
    // The rest of the line, spaces and all, is the start of the formats the rule is for.
    std::istringstream again(text);
    for (size_t i = 0; i < used; ++i) {
        std::string skipped;
        again >> skipped;
    }
    std::string rest;
    std::getline(again, rest);
    const size_t first = rest.find_first_not_of(" \t");
    const size_t last = rest.find_last_not_of(" \t\r");
    if (first != std::string::npos) rule.formatStart = rest.substr(first, last - first + 1);
    if (!rule.formatStart.empty() && rule.category.empty()) return std::nullopt;  // a format is in one category
    return rule;
}

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

void applyConfiguration(const std::string& text, bool keepRates) {
    std::vector<std::pair<std::string, int>> settings;
    std::vector<LogRateRule> rateSettings;
    std::istringstream lines(text);
    std::string line;
    for (int number = 1; std::getline(lines, line); ++number) {
        if (const size_t hash = line.find('#'); hash != std::string::npos) line.erase(hash);
        std::istringstream words(line);
        std::string category, level, extra;
        if (!(words >> category)) continue;
        if (category == "rate") {
            std::string rest;
            std::getline(words, rest);
            std::optional<LogRateRule> parsed = parseRateLine(rest);
            if (!parsed) {
                throw std::invalid_argument("line " + std::to_string(number) +
                                            ": expected \"rate [CATEGORY] BURST PER_SECOND [FORMAT START]\" or "
                                            "\"rate [CATEGORY] unlimited [FORMAT START]\" (BURST 1 to 1000000, "
                                            "PER_SECOND 0.001 to 1000000; a format start needs a category)");
            }
            rateSettings.push_back(std::move(*parsed));
            continue;
        }
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
    if (!keepRates) resetRates();
    for (const LogRateRule& rule : rateSettings) setRate(rule);
}

void setRate(const LogRateRule& rule) {
    auto& state = SinkState::shared();
    std::lock_guard lock(state.guardMutex);
    state.resolved.clear();
    // A later rule for the same category and format start replaces the earlier one.
    std::erase_if(state.rules, [&](const LogRateRule& old) {
        return old.category == rule.category && old.formatStart == rule.formatStart;
    });
    state.rules.push_back(rule);
}

LogRate rate(const std::string& category, const char* format) {
    auto& state = SinkState::shared();
    std::lock_guard lock(state.guardMutex);
    return state.rateFor(category, format);
}

void resetRates() {
    auto& state = SinkState::shared();
    std::lock_guard lock(state.guardMutex);
    state.rules.clear();
    state.resolved.clear();
}

void flushFolded(bool everything) { SinkState::shared().flush(everything); }

void setObserver(std::shared_ptr<LogSink> observer) {
    auto& state = SinkState::shared();
    std::lock_guard lock(state.mutex);
    state.observed.store(observer != nullptr);
    state.observer = std::move(observer);
}

void setThreadContext(const LogContext& context) { threadContext = context; }
void clearThreadContext() {
    // Cleared in place: the device name's storage is kept for the next report.
    threadContext.device.clear();
    threadContext.service.reset();
    threadContext.frame.reset();
}

std::string messageId(const LogRecord& record) {
    // A stable 128-bit identifier of the message format: two 64-bit FNV-1a hashes of the
    // subsystem, category and format text, so that it is the same in every build.
    auto hash = [&](uint64_t seed) {
        uint64_t value = seed;
        auto mix = [&](const char* text) {
            for (const char* c = text; *c; ++c) value = (value ^ static_cast<unsigned char>(*c)) * 0x100000001b3ull;
            value = (value ^ 0xffu) * 0x100000001b3ull;
        };
        mix(record.subsystem.c_str());
        mix(record.category.c_str());
        mix(record.format ? record.format : "");
        return value;
    };
    char text[33];
    std::snprintf(text, sizeof text, "%016llx%016llx", static_cast<unsigned long long>(hash(0xcbf29ce484222325ull)),
                  static_cast<unsigned long long>(hash(0x84222325cbf29ce4ull)));
    return text;
}

void setSink(std::shared_ptr<LogSink> sink, bool rateGuarded) {
    auto& state = SinkState::shared();
    std::lock_guard lock(state.mutex);
    state.custom = std::move(sink);
    state.customGuarded = rateGuarded;
}

void setRateGuarded(bool guarded) {
    auto& state = SinkState::shared();
    std::lock_guard lock(state.mutex);
    state.automaticGuarded = guarded;
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
