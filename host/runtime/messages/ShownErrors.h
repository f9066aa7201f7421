// SPDX-License-Identifier: Apache-2.0
// Whether a piece of work showed an error although it did not fail: nodes that cannot be evaluated keep their last
// value.
#pragma once

#include <string>

namespace OpenQuarn {

/// Notes the first error or report that is shown while it lives, on whatever thread. They nest: what the inner one
/// noted the outer one notes as well, when the inner one goes, unless it was forgotten. Thread: main.
class ShownErrors {
public:
    ShownErrors();
    ~ShownErrors();
    ShownErrors(const ShownErrors&) = delete;
    ShownErrors& operator=(const ShownErrors&) = delete;

    /// Text of the first; "" when none was shown.
    std::string first() const;
    /// What was noted is no error to anybody.
    void forget();

    /// Has the innermost note it. Thread: any.
    static void note(const std::string& text);

private:
    ShownErrors* outer_;
    std::string first_;
};

} // namespace OpenQuarn
