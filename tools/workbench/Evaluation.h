#pragma once
// Evaluation: replays recordings through fresh pipelines, as `tolkatouch replay --fast` does, and
// scores the gestures against their labels (Matching.h). Recordings run in parallel over `jobs`
// threads; each recording's tallies are added in corpus order, so the result is the same for any
// number of threads. A document that cannot be read, has no labels beside it or whose labels do
// not fit it is a failure, named with its reason, and the rest goes on.

#include <cstdint>
#include <functional>
#include <string>
#include <utility>
#include <vector>

#include "pipeline/PipelineRecording.h"
#include "platform/PropertyValue.h"
#include "tools/workbench/Counts.h"
#include "tools/workbench/Labels.h"
#include "tools/workbench/Matching.h"

namespace TolkaTouch::Workbench {

using Settings = std::vector<std::pair<std::string, PropertyValue>>;  // "Algs." keys, in order

struct FileFailure {
    std::string path;
    std::string reason;
    bool operator==(const FileFailure&) const = default;
};

struct EvaluationOptions {
    Settings settings;  // applied before each recording's first frame
    int64_t toleranceUs = kDefaultToleranceUs;
    unsigned jobs = 1;
    // Called after each recording, from the calling thread, with how many are done of how many.
    std::function<void(size_t done, size_t total)> progress;
};

struct Evaluation {
    int64_t toleranceUs = kDefaultToleranceUs;
    Settings settings;
    Counts counts;
    std::vector<FileFailure> failures;  // sorted by path

    // Adds another evaluation's tallies and failures. Throws std::invalid_argument when the two
    // were made with other settings or another tolerance: such sums mean nothing.
    void add(const Evaluation& other);
};

// Checked "KEY=VALUE" assignments (as `--set` takes them) as settings; throws SettingError.
Settings settingsFromAssignments(const std::vector<std::string>& assignments);

// The documents named by paths: a file as it is, a folder by every *.json in it and below that is
// not a labels file, sorted. A path that does not exist is a failure.
struct CorpusListing {
    std::vector<std::string> documents;
    std::vector<FileFailure> failures;
};
CorpusListing listCorpus(const std::vector<std::string>& paths);

// Share index (1-based) of count: every count-th document from the index-th on.
std::vector<std::string> shardOf(const std::vector<std::string>& documents, size_t index, size_t count);

// One recording against its labels: its tallies, with recordings, frames and duration set; with
// mismatches, also where the gestures and the labels disagree (Matching.h).
Counts evaluateRecording(const PipelineRecording& recording, const std::vector<Label>& labels, const Settings& settings,
                         int64_t toleranceUs, std::vector<Mismatch>* mismatches = nullptr);

// Reads and evaluates every document, each with DOC.labels.json beside it.
Evaluation evaluate(const std::vector<std::string>& documents, const EvaluationOptions& options);

// A corpus read once and kept in memory, for evaluating it under many settings.
struct LoadedRecording {
    std::string path;
    PipelineRecording recording;
    std::vector<Label> labels;
};
struct LoadedCorpus {
    std::vector<LoadedRecording> recordings;  // in the order of the documents
    std::vector<FileFailure> failures;
};
LoadedCorpus loadCorpus(const std::vector<std::string>& documents, unsigned jobs,
                        const std::function<void(size_t done, size_t total)>& progress = {});
Evaluation evaluateLoaded(const LoadedCorpus& corpus, const EvaluationOptions& options);

}  // namespace TolkaTouch::Workbench
