// SPDX-License-Identifier: Apache-2.0
// Names that no two things share.
#pragma once

#include <string>
#include <unordered_set>

namespace quarn {

/// Hands out names, each once.
class UniqueNames {
public:
    /// `wanted`, or `fallback` where it is empty; with a number behind it, from 1, where the name is taken.
    std::string take(const std::string& wanted, const std::string& fallback) {
        const std::string base = wanted.empty() ? fallback : wanted;
        std::string name = base;
        for (unsigned number = 1; !taken_.insert(name).second; ++number)
            name = base + std::to_string(number);
        return name;
    }

private:
    std::unordered_set<std::string> taken_;
};

} // namespace quarn
