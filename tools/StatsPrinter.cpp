#include "tools/StatsPrinter.h"

#include <algorithm>
#include <cstdint>
#include <utility>
#include <vector>

#include <fmt/format.h>
#include <nlohmann/json.hpp>

#include "platform/PropertyValueJson.h"


namespace TolkaTouch::Tools {

namespace {

const std::string kEventStatsKey = "Algs.EventStats";

}  // namespace

std::string statsJsonLine(const Pipeline& pipeline) {
    nlohmann::ordered_json line = nlohmann::ordered_json::object();
    line["stats"] = PropertyValueJson::toJson(pipeline.getState(kEventStatsKey));
    line["ResetCount"] = pipeline.resetCount;
    line["DisjointImageCount"] = pipeline.disjointImageCount;
    return line.dump();
}

std::string statsTable(const Pipeline& pipeline) {
    std::vector<std::pair<std::string, uint64_t>> rows = {
        {"ResetCount", pipeline.resetCount},
        {"DisjointImageCount", pipeline.disjointImageCount},
    };
    const PropertyValue stats = pipeline.getState(kEventStatsKey);
    for (const char* group : {"Dispatched", "Rejected"}) {
        const PropertyValue* counters = stats.find(group);
        if (counters == nullptr || !counters->isDictionary()) continue;
        for (const auto& [name, value] : *counters->dictionary()) rows.emplace_back(name, value.toUInt64());
    }
    std::erase_if(rows, [](const auto& row) { return row.second == 0; });

    size_t nameWidth = 0;
    size_t numberWidth = 0;
    for (const auto& [name, count] : rows) {
        nameWidth = std::max(nameWidth, name.size());
        numberWidth = std::max(numberWidth, std::to_string(count).size());
    }
    std::string table;
    for (const auto& [name, count] : rows) {
        table += fmt::format("{:<{}}  {:>{}}\n", name, nameWidth, count, numberWidth);
    }
    return table;
}

}  // namespace TolkaTouch::Tools
