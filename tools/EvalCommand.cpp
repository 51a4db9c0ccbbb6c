// tolkatouch eval: replays a labelled corpus and scores the recognizer against its labels, or
// adds up the results of shards.

#include <cstdio>
#include <memory>
#include <string>
#include <vector>

#include <CLI/CLI.hpp>

#include "tools/Commands.h"
#include "tools/CorpusArguments.h"
#include "tools/DocumentFile.h"
#include "tools/EvaluationTable.h"
#include "tools/workbench/EvaluationJson.h"

namespace TolkaTouch::Tools {

namespace {

struct EvalArguments {
    CorpusArguments corpus;
    bool json = false;
    std::string shard;
    bool merge = false;
};

// "I/N" with 1 <= I <= N.
std::pair<size_t, size_t> shardFromText(const std::string& text) {
    size_t index = 0;
    size_t count = 0;
    char extra = 0;
    if (std::sscanf(text.c_str(), "%zu/%zu%c", &index, &count, &extra) != 2 || index == 0 || count == 0 || index > count) {
        throw CLI::ValidationError("--shard", "expected I/N with 1 <= I <= N, e.g. 2/8");
    }
    return {index, count};
}

void printEvaluation(const Workbench::Evaluation& evaluation, bool json) {
    const std::string text = json ? Workbench::evaluationJson(evaluation).dump() + "\n" : evaluationTable(evaluation);
    std::fputs(text.c_str(), stdout);
    std::fflush(stdout);
}

Workbench::Evaluation mergedResults(const std::vector<std::string>& paths) {
    if (paths.empty()) throw ToolError("eval --merge", "no results named");
    Workbench::Evaluation total;
    for (size_t i = 0; i < paths.size(); ++i) {
        const std::vector<uint8_t> text = readFileBytes(paths[i]);
        Workbench::Evaluation part;
        try {
            part = Workbench::evaluationFromJson(std::string_view(reinterpret_cast<const char*>(text.data()), text.size()));
        } catch (const Workbench::EvaluationJsonError& error) {
            throw ToolError(paths[i], error.what());
        }
        if (i == 0) {
            total = std::move(part);
            continue;
        }
        try {
            total.add(part);
        } catch (const std::invalid_argument& error) {
            throw ToolError(paths[i], error.what());
        }
    }
    return total;
}

void runEval(const EvalArguments& arguments) {
    if (arguments.merge) {
        printEvaluation(mergedResults(arguments.corpus.paths), arguments.json);
        return;
    }
    Workbench::EvaluationOptions options;
    options.settings = Workbench::settingsFromAssignments(arguments.corpus.allSettings());
    options.toleranceUs = arguments.corpus.toleranceUs();
    options.jobs = arguments.corpus.threads();
    Workbench::CorpusListing listing = arguments.corpus.listing();
    std::vector<std::string> documents = listing.documents;
    if (!arguments.shard.empty()) {
        const auto [index, count] = shardFromText(arguments.shard);
        documents = Workbench::shardOf(documents, index, count);
    }
    ProgressLine progress("eval: recordings");
    options.progress = [&progress](size_t done, size_t total) { progress.update(done, total); };
    Workbench::Evaluation evaluation = Workbench::evaluate(documents, options);
    progress.finish();
    evaluation.failures.insert(evaluation.failures.begin(), listing.failures.begin(), listing.failures.end());
    printEvaluation(evaluation, arguments.json);
    failWhenFilesFailed(evaluation.failures, documents.size() + listing.failures.size());
}

}  // namespace

void addEvalCommand(CLI::App& app) {
    auto arguments = std::make_shared<EvalArguments>();
    CLI::App* command = app.add_subcommand(
        "eval",
        "Replay labelled recordings (each DOC.json with DOC.labels.json beside it) and score the recognizer: per gesture "
        "and zone TP/FP/FN, precision, recall, F1; confusion matrix; latency; splits, merges, wrong places; false "
        "activations per hour and false-reject rate. Exits 1 when a file could not be evaluated.");
    arguments->corpus.addTo(*command, "Documents and folders of documents; with --merge, result files of eval --json");
    command->add_flag("--json", arguments->json, "Print the result as JSON, with every raw count (what --merge adds up)");
    command->add_option("--shard", arguments->shard, "Evaluate only share I of N of the corpus (every N-th document from the I-th)")
        ->type_name("I/N")
        ->check(CLI::Validator(
            [](std::string& text) {
                try {
                    shardFromText(text);
                } catch (const CLI::ValidationError&) {
                    return std::string("expected I/N with 1 <= I <= N, e.g. 2/8");
                }
                return std::string();
            },
            ""));
    command->add_flag("--merge", arguments->merge, "Add up the results (eval --json) of shards named by PATHS");
    command->callback([arguments] { runEval(*arguments); });
}

}  // namespace TolkaTouch::Tools
