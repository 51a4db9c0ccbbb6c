#pragma once
// What eval and sweep share on the command line: the corpus named by paths and list files, the
// number of threads, and a progress line on standard error that shows only on a terminal.

#include <cstddef>
#include <string>
#include <vector>

#include "tools/workbench/Evaluation.h"

namespace CLI {
class App;
}

namespace TolkaTouch::Tools {

struct CorpusArguments {
    std::vector<std::string> paths;
    std::vector<std::string> lists;
    unsigned jobs = 0;  // 0: one per core
    double toleranceMs = 100.0;
    std::vector<std::string> settings;
    std::vector<std::string> settingsFiles;

    void addTo(CLI::App& command, const char* pathsHelp);
    // The documents in order; paths that name nothing join the failures.
    Workbench::CorpusListing listing() const;
    unsigned threads() const;
    // The --settings files' settings, then the --set ones.
    std::vector<std::string> allSettings() const;
    int64_t toleranceUs() const;
};

// "\r<what> 12/500" on standard error while standard error is a terminal; cleared by finish().
class ProgressLine {
public:
    explicit ProgressLine(std::string what);
    void update(size_t done, size_t total);
    void finish();

private:
    std::string _what;
    bool _terminal = false;
    bool _shown = false;
};

// Throws ToolError naming how many files were not evaluated, when any were not.
void failWhenFilesFailed(const std::vector<Workbench::FileFailure>& failures, size_t total);

}  // namespace TolkaTouch::Tools
