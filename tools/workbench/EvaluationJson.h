#pragma once
// The JSON form of an evaluation, what `tolkatouch eval --json` writes and `eval --merge` reads:
//
//   {"Version": 1, "ToleranceMs": 100, "Settings": {"Algs.HoldTimeoutMilliseconds": 700},
//    "Counts": {...every raw tally and latency sample...},
//    "Failures": [{"File": "...", "Reason": "..."}],
//    "Metrics": {...precision, recall, F1, latency percentiles, rates: derived, for reading...}}
//
// Reading takes Version, ToleranceMs, Settings, Counts and Failures and ignores Metrics, so
// results of shards add up to exactly the result of the whole.

#include <stdexcept>
#include <string>
#include <string_view>

#include <nlohmann/json.hpp>

#include "tools/workbench/Evaluation.h"

namespace TolkaTouch::Workbench {

class EvaluationJsonError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

nlohmann::ordered_json evaluationJson(const Evaluation& evaluation);
nlohmann::ordered_json metricsJson(const Counts& counts);

// Throws EvaluationJsonError naming what is missing or wrong.
Evaluation evaluationFromJson(std::string_view text);

}  // namespace TolkaTouch::Workbench
