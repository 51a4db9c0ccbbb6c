#pragma once
// The candidate nearest to a mistyped word (fewest single-character edits; the first of equals),
// for "did you mean" suggestions.

#include <string>
#include <string_view>
#include <vector>

namespace TolkaTouch {

size_t editDistance(std::string_view a, std::string_view b);
std::string nearestWord(std::string_view word, const std::vector<std::string>& candidates);

}  // namespace TolkaTouch
