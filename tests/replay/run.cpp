// SPDX-License-Identifier: Apache-2.0
#include "run.h"

#include <algorithm>
#include <exception>

namespace replay {

const Kind* findKind(std::string_view name) {
    const auto found = std::find_if(std::begin(kinds), std::end(kinds), [&](const Kind& k) { return k.name == name; });
    return found == std::end(kinds) ? nullptr : found;
}

std::vector<Disagreement> replayCase(const Kind& kind, const Case& testCase, double tolerance) {
    rapidjson::Document results;
    Input input(testCase.input(), testCase.folder);
    try {
        const Json actual = kind.replay(input, results.GetAllocator());
        auto disagreements = compare(testCase.expected(), actual, tolerance);
        for (const std::string& key : input.unread())
            disagreements.push_back({"input." + key, "(read by the replay)", "(not read)"});
        return disagreements;
    } catch (const std::exception& error) {
        return {{"(exception)", "none", error.what()}};
    }
}

} // namespace replay
