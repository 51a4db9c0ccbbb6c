// Evaluating a corpus of files: the same result for any number of threads, shards that add up to
// the whole, and files that cannot be evaluated named with their reason while the rest goes on.

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>

#include "tools/GestureScript.h"
#include "tools/Synthesizer.h"
#include "tools/workbench/Evaluation.h"
#include "tools/workbench/EvaluationJson.h"
#include "tools/workbench/SynthesisLabels.h"

namespace TolkaTouch::Workbench {
namespace {

namespace fs = std::filesystem;

constexpr const char* kScript =
    "tap volume-up 120ms\nwait 400ms\nhold play-pause 900ms\nwait 300ms\nbrush volume-down 90ms\nwait 300ms\n"
    "tap volume-down 60ms\nwait 300ms\nhold volume-up 1.2s\nreset 700ms\nwait 300ms\n";

void writeText(const fs::path& path, const std::string& text) { std::ofstream(path, std::ios::binary) << text; }

class EvaluationTest : public ::testing::Test {
protected:
    void SetUp() override {
        _folder = fs::path(::testing::TempDir()) / ("evaluation-" + std::to_string(::getpid()));
        fs::create_directories(_folder);
        const Tools::GestureScript script = Tools::GestureScript::parse(kScript);
        for (uint64_t seed = 1; seed <= 9; ++seed) {
            Tools::SynthesisOptions options;
            options.finger = static_cast<Tools::Finger>(seed % 3);
            options.noiseDeviation = 2.0 + static_cast<double>(seed);
            const Tools::Synthesis synthesis = Tools::synthesize(script, seed, options);
            const std::vector<uint8_t> document = Tools::recordingFromSynthesis(synthesis).json();
            const fs::path path = _folder / ("rec-" + std::to_string(seed) + ".json");
            writeText(path, std::string(document.begin(), document.end()));
            writeText(labelsPathFor(path.string()), labelsDocument(labelsOfSynthesis(synthesis)));
            _documents.push_back(path.string());
        }
    }
    void TearDown() override { fs::remove_all(_folder); }

    fs::path _folder;
    std::vector<std::string> _documents;
};

TEST_F(EvaluationTest, ResultIsTheSameForAnyNumberOfThreads) {
    EvaluationOptions options;
    options.jobs = 1;
    const Evaluation one = evaluate(_documents, options);
    EXPECT_EQ(one.counts.recordings, 9u);
    EXPECT_GT(one.counts.intendedGestures, 0u);
    for (unsigned jobs : {2u, 3u, 8u}) {
        options.jobs = jobs;
        const Evaluation many = evaluate(_documents, options);
        EXPECT_EQ(many.counts, one.counts) << jobs;
        EXPECT_EQ(evaluationJson(many).dump(), evaluationJson(one).dump()) << jobs;
    }
}

TEST_F(EvaluationTest, ShardsReadBackFromJsonAddUpToTheWhole) {
    EvaluationOptions options;
    options.settings = {{"Algs.HoldTimeoutMilliseconds", PropertyValue(600u)}};
    options.jobs = 2;
    const Evaluation whole = evaluate(_documents, options);
    Evaluation total;
    for (size_t index = 1; index <= 4; ++index) {
        const Evaluation shard = evaluate(shardOf(_documents, index, 4), options);
        const Evaluation read = evaluationFromJson(evaluationJson(shard).dump());
        if (index == 1) {
            total = read;
        } else {
            total.add(read);
        }
    }
    EXPECT_EQ(total.counts, whole.counts);
    EXPECT_EQ(evaluationJson(total).dump(), evaluationJson(whole).dump());
}

TEST_F(EvaluationTest, ResultsUnderOtherSettingsDoNotAddUp) {
    Evaluation a;
    Evaluation b;
    b.settings = {{"Algs.HoldTimeoutMilliseconds", PropertyValue(600u)}};
    EXPECT_THROW(a.add(b), std::invalid_argument);
    Evaluation c;
    c.toleranceUs = 50'000;
    EXPECT_THROW(a.add(c), std::invalid_argument);
}

TEST_F(EvaluationTest, SettingsChangeTheOutcome) {
    EvaluationOptions options;
    const Evaluation defaults = evaluate(_documents, options);
    options.settings = settingsFromAssignments({"HoldTimeoutMilliseconds=2000"});
    const Evaluation longTimeout = evaluate(_documents, options);
    EXPECT_LT(longTimeout.counts.latencyUs[1].size(), defaults.counts.latencyUs[1].size());
}

TEST_F(EvaluationTest, FilesThatCannotBeEvaluatedAreNamedWithTheirReasonAndTheRestGoesOn) {
    const std::string unreadable = (_folder / "broken.json").string();
    writeText(unreadable, "{");
    const std::string unlabelled = (_folder / "unlabelled.json").string();
    fs::copy_file(_documents[0], unlabelled);
    const std::string mislabelled = (_folder / "mislabelled.json").string();
    fs::copy_file(_documents[1], mislabelled);
    writeText(labelsPathFor(mislabelled), R"({"Version": 1, "Labels": [{"Kind": "tap", "Zone": "volume-up", "StartMs": 99000, "EndMs": 99100}]})");
    const std::string badLabels = (_folder / "bad-labels.json").string();
    fs::copy_file(_documents[2], badLabels);
    writeText(labelsPathFor(badLabels), R"({"Version": 1, "Labels": [{"Kind": "jump", "Zone": "volume-up", "StartMs": 1, "EndMs": 2}]})");

    std::vector<std::string> documents = _documents;
    documents.insert(documents.begin(), {unreadable, unlabelled, mislabelled, badLabels});
    const Evaluation evaluation = evaluate(documents, EvaluationOptions{});
    EXPECT_EQ(evaluation.counts.recordings, 9u);
    ASSERT_EQ(evaluation.failures.size(), 4u);
    EXPECT_EQ(evaluation.failures[0].path, badLabels);
    EXPECT_EQ(evaluation.failures[0].reason,
              "labels: " + labelsPathFor(badLabels) + ": label 1: unknown kind 'jump' (tap, hold, slide, brush, none)");
    EXPECT_EQ(evaluation.failures[1].path, unreadable);
    EXPECT_EQ(evaluation.failures[2].path, mislabelled);
    EXPECT_TRUE(evaluation.failures[2].reason.starts_with("labels: " + labelsPathFor(mislabelled) + ": label 1 starts at 99000 ms, after the recording's last frame at "))
        << evaluation.failures[2].reason;
    EXPECT_EQ(evaluation.failures[3].path, unlabelled);
    EXPECT_EQ(evaluation.failures[3].reason, "no labels: " + labelsPathFor(unlabelled) + ": No such file or directory");
}

TEST_F(EvaluationTest, FolderListsItsDocumentsSortedWithoutLabelsFiles) {
    const CorpusListing listing = listCorpus({_folder.string(), (_folder / "missing.json").string()});
    std::vector<std::string> expected = _documents;
    std::sort(expected.begin(), expected.end());
    EXPECT_EQ(listing.documents, expected);
    ASSERT_EQ(listing.failures.size(), 1u);
    EXPECT_EQ(listing.failures[0].reason, "no such file or folder");
}

TEST_F(EvaluationTest, FolderListsLineFormRecordingsBesideDocuments) {
    const auto recorded = _folder / "recorded.0001.jsonl";
    writeText(recorded.string(), "{\"Version\":1,\"Format\":\"lines\"}\n");
    writeText((_folder / "notes.txt").string(), "not a recording\n");
    std::vector<std::string> expected = _documents;
    expected.push_back(recorded.string());
    std::sort(expected.begin(), expected.end());
    EXPECT_EQ(listCorpus({_folder.string()}).documents, expected);
    std::filesystem::remove(recorded);
    std::filesystem::remove(_folder / "notes.txt");
}

TEST_F(EvaluationTest, LoadedCorpusGivesWhatFilesGive) {
    EvaluationOptions options;
    options.jobs = 2;
    EXPECT_EQ(evaluateLoaded(loadCorpus(_documents, 2), options).counts, evaluate(_documents, options).counts);
}

TEST(ShardTest, EveryNthDocumentFromTheIth) {
    const std::vector<std::string> documents{"a", "b", "c", "d", "e"};
    EXPECT_EQ(shardOf(documents, 1, 2), (std::vector<std::string>{"a", "c", "e"}));
    EXPECT_EQ(shardOf(documents, 2, 2), (std::vector<std::string>{"b", "d"}));
    EXPECT_THROW(shardOf(documents, 3, 2), std::invalid_argument);
    EXPECT_THROW(shardOf(documents, 0, 2), std::invalid_argument);
}

}  // namespace
}  // namespace TolkaTouch::Workbench
