#include "tools/workbench/Evaluation.h"

#include <algorithm>
#include <atomic>
#include <condition_variable>
#include <filesystem>
#include <mutex>
#include <optional>
#include <stdexcept>
#include <thread>

#include "common/Util.h"
#include "platform/PropertyValueJson.h"
#include "tolkatouch/Gesture.h"
#include "tolkatouch/Settings.h"
#include "tools/DocumentFile.h"
#include "tools/Replayer.h"

namespace TolkaTouch::Workbench {

namespace {

// The reason part of a ToolError ("<path>: <reason>").
std::string reasonOf(const std::exception& error, const std::string& path) {
    std::string text = error.what();
    if (text.starts_with(path + ": ")) text.erase(0, path.size() + 2);
    return text;
}

// The settings as text in key order, to tell whether two evaluations ran under the same ones.
std::string settingsText(const Settings& settings) {
    nlohmann::json object = nlohmann::json::object();
    for (const auto& [key, value] : settings) object[key] = PropertyValueJson::toJson(value);
    return object.dump();
}

// Runs work(i) for i below count over `jobs` threads; after each, done(i) on the calling thread,
// in any order.
void forEachParallel(size_t count, unsigned jobs, const std::function<void(size_t)>& work, const std::function<void(size_t)>& done) {
    const unsigned threads = static_cast<unsigned>(std::min<size_t>(std::max(1u, jobs), count));
    if (threads <= 1) {
        for (size_t i = 0; i < count; ++i) {
            work(i);
            done(i);
        }
        return;
    }
    std::atomic<size_t> next{0};
    std::mutex mutex;
    std::condition_variable finished;
    std::vector<size_t> completed;
    std::exception_ptr failure;
    std::vector<std::thread> pool;
    for (unsigned t = 0; t < threads; ++t) {
        pool.emplace_back([&] {
            for (size_t i = next++; i < count; i = next++) {
                try {
                    work(i);
                } catch (...) {
                    std::lock_guard lock(mutex);
                    if (!failure) failure = std::current_exception();
                }
                std::lock_guard lock(mutex);
                completed.push_back(i);
                finished.notify_one();
            }
        });
    }
    size_t reported = 0;
    while (reported < count) {
        std::vector<size_t> batch;
        {
            std::unique_lock lock(mutex);
            finished.wait(lock, [&] { return !completed.empty(); });
            batch.swap(completed);
        }
        for (size_t i : batch) done(i);
        reported += batch.size();
    }
    for (std::thread& thread : pool) thread.join();
    if (failure) std::rethrow_exception(failure);
}

struct Loaded {
    std::optional<LoadedRecording> recording;
    std::optional<FileFailure> failure;
};

// The labels must lie within the recording; a label past its end belongs to another recording.
void checkLabelsFit(const std::vector<Label>& labels, uint64_t durationUs) {
    for (size_t i = 0; i < labels.size(); ++i) {
        if (labels[i].startUs > static_cast<int64_t>(durationUs)) {
            throw LabelsError("label " + std::to_string(i + 1) + " starts at " + std::to_string(labels[i].startUs / 1000) +
                              " ms, after the recording's last frame at " + std::to_string(durationUs / 1000) + " ms");
        }
    }
}

uint64_t durationUsOf(const PipelineRecording& recording) {
    if (recording.frames().empty()) return 0;
    const uint64_t first = recording.frames().front().timestamp;
    const uint64_t last = recording.frames().back().timestamp;
    return last > first ? (last - first) / 1000 : 0;
}

Loaded loadOne(const std::string& path) {
    Loaded loaded;
    LoadedRecording recording;
    recording.path = path;
    try {
        recording.recording = Tools::loadRecording(path);
    } catch (const std::exception& error) {
        loaded.failure = FileFailure{path, reasonOf(error, path)};
        return loaded;
    }
    const std::string labelsPath = labelsPathFor(path);
    std::vector<uint8_t> text;
    try {
        text = Tools::readFileBytes(labelsPath);
    } catch (const std::exception& error) {
        loaded.failure = FileFailure{path, "no labels: " + labelsPath + ": " + reasonOf(error, labelsPath)};
        return loaded;
    }
    try {
        recording.labels = parseLabels(std::string_view(reinterpret_cast<const char*>(text.data()), text.size()));
        checkLabelsFit(recording.labels, durationUsOf(recording.recording));
    } catch (const LabelsError& error) {
        loaded.failure = FileFailure{path, "labels: " + labelsPath + ": " + error.what()};
        return loaded;
    }
    loaded.recording = std::move(recording);
    return loaded;
}

void sortFailures(std::vector<FileFailure>& failures) {
    std::stable_sort(failures.begin(), failures.end(), [](const FileFailure& a, const FileFailure& b) { return a.path < b.path; });
}

}  // namespace

void Evaluation::add(const Evaluation& other) {
    if (other.toleranceUs != toleranceUs) throw std::invalid_argument("evaluations with different tolerances do not add up");
    if (settingsText(other.settings) != settingsText(settings)) {
        throw std::invalid_argument("evaluations under different settings do not add up");
    }
    counts.add(other.counts);
    failures.insert(failures.end(), other.failures.begin(), other.failures.end());
    sortFailures(failures);
}

Settings settingsFromAssignments(const std::vector<std::string>& assignments) {
    Settings settings;
    for (const std::string& assignment : assignments) {
        const CheckedSetting checked = checkSettingAssignment(assignment);
        settings.emplace_back(checked.setting->algsKey(), checked.value);
    }
    return settings;
}

CorpusListing listCorpus(const std::vector<std::string>& paths) {
    namespace fs = std::filesystem;
    CorpusListing listing;
    for (const std::string& path : paths) {
        std::error_code error;
        if (fs::is_directory(path, error)) {
            std::vector<std::string> found;
            for (auto it = fs::recursive_directory_iterator(path, error); !error && it != fs::recursive_directory_iterator();
                 it.increment(error)) {
                const std::string name = it->path().string();
                if (it->is_regular_file() && (name.ends_with(".json") || name.ends_with(".jsonl")) && !isLabelsPath(name)) {
                    found.push_back(name);
                }
            }
            if (error) listing.failures.push_back(FileFailure{path, error.message()});
            std::sort(found.begin(), found.end());
            listing.documents.insert(listing.documents.end(), found.begin(), found.end());
        } else if (fs::exists(path, error)) {
            listing.documents.push_back(path);
        } else {
            listing.failures.push_back(FileFailure{path, "no such file or folder"});
        }
    }
    return listing;
}

std::vector<std::string> shardOf(const std::vector<std::string>& documents, size_t index, size_t count) {
    if (count == 0 || index == 0 || index > count) throw std::invalid_argument("a shard is I/N with 1 <= I <= N");
    std::vector<std::string> share;
    for (size_t i = index - 1; i < documents.size(); i += count) share.push_back(documents[i]);
    return share;
}

Counts evaluateRecording(const PipelineRecording& recording, const std::vector<Label>& labels, const Settings& settings,
                         int64_t toleranceUs, std::vector<Mismatch>* mismatches) {
    Tools::Replayer replayer{PipelineRecording(recording)};
    const uint64_t origin = replayer.origin();
    GestureCollector collector;
    Tools::ReplayOptions options;
    options.fast = true;
    options.settings = settings;
    replayer.run(options, [&](const HIDEvent& event) {
        const std::optional<Gesture> gesture = GestureCodec::decode(event);
        if (!gesture) return;
        const int64_t sinceUs = event.timestamp >= origin
                                    ? static_cast<int64_t>(Util::nanosecondsFromMachTime(event.timestamp - origin) / 1000)
                                    : -static_cast<int64_t>(Util::nanosecondsFromMachTime(origin - event.timestamp) / 1000);
        collector.add(*gesture, sinceUs);
    });
    const uint64_t durationUs = durationUsOf(recording);
    Counts counts;
    matchRecording(labels, collector.finish(static_cast<int64_t>(durationUs)), durationUs, toleranceUs, counts, mismatches);
    counts.recordings = 1;
    counts.frames = recording.frames().size();
    counts.durationUs = durationUs;
    return counts;
}

Evaluation evaluate(const std::vector<std::string>& documents, const EvaluationOptions& options) {
    std::vector<Counts> counts(documents.size());
    std::vector<std::optional<FileFailure>> failures(documents.size());
    size_t done = 0;
    forEachParallel(
        documents.size(), options.jobs,
        [&](size_t i) {
            Loaded loaded = loadOne(documents[i]);
            if (loaded.failure) {
                failures[i] = std::move(loaded.failure);
                return;
            }
            counts[i] = evaluateRecording(loaded.recording->recording, loaded.recording->labels, options.settings, options.toleranceUs);
        },
        [&](size_t) {
            if (options.progress) options.progress(++done, documents.size());
        });
    Evaluation evaluation;
    evaluation.toleranceUs = options.toleranceUs;
    evaluation.settings = options.settings;
    for (size_t i = 0; i < documents.size(); ++i) {
        if (failures[i]) {
            evaluation.failures.push_back(*failures[i]);
        } else {
            evaluation.counts.add(counts[i]);
        }
    }
    sortFailures(evaluation.failures);
    return evaluation;
}

LoadedCorpus loadCorpus(const std::vector<std::string>& documents, unsigned jobs, const std::function<void(size_t, size_t)>& progress) {
    std::vector<Loaded> loaded(documents.size());
    size_t done = 0;
    forEachParallel(
        documents.size(), jobs, [&](size_t i) { loaded[i] = loadOne(documents[i]); },
        [&](size_t) {
            if (progress) progress(++done, documents.size());
        });
    LoadedCorpus corpus;
    for (Loaded& item : loaded) {
        if (item.failure) {
            corpus.failures.push_back(std::move(*item.failure));
        } else {
            corpus.recordings.push_back(std::move(*item.recording));
        }
    }
    sortFailures(corpus.failures);
    return corpus;
}

Evaluation evaluateLoaded(const LoadedCorpus& corpus, const EvaluationOptions& options) {
    std::vector<Counts> counts(corpus.recordings.size());
    size_t done = 0;
    forEachParallel(
        corpus.recordings.size(), options.jobs,
        [&](size_t i) {
            const LoadedRecording& item = corpus.recordings[i];
            counts[i] = evaluateRecording(item.recording, item.labels, options.settings, options.toleranceUs);
        },
        [&](size_t) {
            if (options.progress) options.progress(++done, corpus.recordings.size());
        });
    Evaluation evaluation;
    evaluation.toleranceUs = options.toleranceUs;
    evaluation.settings = options.settings;
    evaluation.failures = corpus.failures;
    for (const Counts& part : counts) evaluation.counts.add(part);
    return evaluation;
}

}  // namespace TolkaTouch::Workbench
