#pragma once
// The readable forms of the workbench's results, as `tolkatouch eval` and `sweep` print them:
// the evaluation table, and the sweep's table and CSV.

#include <string>
#include <vector>

#include "tools/workbench/Evaluation.h"
#include "tools/workbench/Sweep.h"

namespace TolkaTouch::Tools {

std::string evaluationTable(const Workbench::Evaluation& evaluation);

// One row per point in ranked order: the swept settings, then the metrics.
std::string sweepTable(const std::vector<Workbench::SweepAxis>& axes, const std::vector<Workbench::SweepResult>& results,
                       const std::vector<size_t>& ranking, const std::string& metric);
std::string sweepCsv(const std::vector<Workbench::SweepAxis>& axes, const std::vector<Workbench::SweepResult>& results,
                     const std::vector<size_t>& ranking);

// "name=value" of each setting, as `--set` takes it.
std::string settingsText(const Workbench::Settings& settings);

}  // namespace TolkaTouch::Tools
