// SPDX-License-Identifier: Apache-2.0
// neuralWarp model runtime: what it has to say, for somebody who shows it in another place than standard output.
#pragma once

#include <string>

namespace neuralWarp {

/// While one lives, the lines that the readers and the sessions of its thread would print on standard output are kept
/// in it, and not printed. One within another takes them alone. Belongs to the thread that made it.
class CaughtLines {
public:
    CaughtLines();
    ~CaughtLines();
    CaughtLines(const CaughtLines&) = delete;
    CaughtLines& operator=(const CaughtLines&) = delete;

    /// All of them so far, each with its line feed. Without those for which there was no memory.
    const std::string& text() const { return text_; }

private:
    friend void printLine(const char* line) noexcept;

    std::string text_;
    CaughtLines* outer_;
};

} // namespace neuralWarp
