#include "tools/CorpusArguments.h"

#include <cstdio>
#include <thread>

#include <CLI/CLI.hpp>
#include <unistd.h>

#include "tools/DocumentFile.h"
#include "common/PrintableText.h"

namespace TolkaTouch::Tools {

void CorpusArguments::addTo(CLI::App& command, const char* pathsHelp) {
    command.add_option("PATHS", paths, pathsHelp);
    command.add_option("--list", lists, "A file naming one document or folder per line (repeatable)")->type_name("FILE");
    command.add_option("-j,--jobs", jobs, "Threads to evaluate recordings on (default: one per core); results are the same for any number")
        ->type_name("N")
        ->check(CLI::Range(1u, 1024u));
    command.add_option("--tolerance", toleranceMs, "How far, in ms, a recognised touch may start outside its label (default 100)")
        ->type_name("MS")
        ->check(CLI::Range(0.0, 10000.0));
    command
        .add_option("--set", settings,
                    "Apply a setting before each recording's first frame, e.g. Algs.HoldTimeoutMilliseconds=700 (repeatable)")
        ->type_name("KEY=VALUE")
        ->expected(1)
        ->allow_extra_args(false)
        ->multi_option_policy(CLI::MultiOptionPolicy::TakeAll);
}

Workbench::CorpusListing CorpusArguments::listing() const {
    std::vector<std::string> all = paths;
    for (const std::string& list : lists) {
        const std::vector<uint8_t> bytes = readFileBytes(list);
        std::string line;
        for (size_t i = 0; i <= bytes.size(); ++i) {
            if (i == bytes.size() || bytes[i] == '\n') {
                while (!line.empty() && (line.back() == '\r' || line.back() == ' ' || line.back() == '\t')) line.pop_back();
                if (!line.empty() && line.front() != '#') all.push_back(line);
                line.clear();
            } else {
                line += static_cast<char>(bytes[i]);
            }
        }
    }
    if (all.empty()) throw ToolError("corpus", "no recordings named (give documents, folders or --list)");
    return Workbench::listCorpus(all);
}

unsigned CorpusArguments::threads() const {
    if (jobs != 0) return jobs;
    return std::max(1u, std::thread::hardware_concurrency());
}

int64_t CorpusArguments::toleranceUs() const { return std::llround(toleranceMs * 1000.0); }

ProgressLine::ProgressLine(std::string what) : _what(std::move(what)), _terminal(isatty(STDERR_FILENO) == 1) {}

void ProgressLine::update(size_t done, size_t total) {
    if (!_terminal) return;
    std::fprintf(stderr, "\r%s %zu/%zu", _what.c_str(), done, total);
    std::fflush(stderr);
    _shown = true;
}

void ProgressLine::finish() {
    if (!_shown) return;
    std::fputs("\r\033[K", stderr);
    std::fflush(stderr);
    _shown = false;
}

void failWhenFilesFailed(const std::vector<Workbench::FileFailure>& failures, size_t total) {
    if (failures.empty()) return;
    for (const Workbench::FileFailure& failure : failures) {
        std::fprintf(stderr, "tolkatouch: %s: %s\n", printableText(failure.path).c_str(), printableText(failure.reason).c_str());
    }
    throw ToolError("eval", std::to_string(failures.size()) + " of " + std::to_string(total) + " files not evaluated");
}

}  // namespace TolkaTouch::Tools
