// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <string>
#include <vector>

namespace OpenQuarn {

/// What was found wrong with a file, up to a number that somebody may still read.
class Warnings {
public:
    void add(std::string text) {
        if (texts_.size() < most)
            texts_.push_back(std::move(text));
        else
            ++dropped_;
    }
    /// All of them; the last says how many more there were.
    std::vector<std::string> take() {
        if (dropped_ > 0)
            texts_.push_back("and " + std::to_string(dropped_) + " more warnings");
        dropped_ = 0;
        return std::move(texts_);
    }

private:
    static constexpr std::size_t most = 200;
    std::vector<std::string> texts_;
    std::size_t dropped_ = 0;
};

} // namespace OpenQuarn
