// SPDX-License-Identifier: Apache-2.0
// Lists from files, for people: a file can hold more than anybody reads.
#pragma once

#include <algorithm>
#include <cstddef>
#include <string>

namespace quarn {

/// Lines, of which the first twenty are kept, as far as a line reaches; the others are counted.
class LineList {
public:
    /// `what` they are, in plural.
    explicit LineList(std::string what)
        : what_(std::move(what)) {}

    void add(const std::string& line) {
        constexpr std::size_t mostLines = 20;
        constexpr std::size_t longestLine = 1000;
        if (++count_ > mostLines)
            return;
        ++shown_;
        text_ += line.size() <= longestLine ? line : line.substr(0, longestLine) + "...";
        text_ += '\n';
    }
    std::string text() const {
        return count_ == shown_ ? text_
                                : text_ + "... and " + std::to_string(count_ - shown_) + " more " + what_ + "\n";
    }

private:
    std::string what_, text_;
    std::size_t count_ = 0, shown_ = 0;
};

} // namespace quarn
