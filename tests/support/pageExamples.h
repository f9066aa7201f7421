// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "openquarn_app/Commands.h"

#include <gtest/gtest.h>

#include <istream>
#include <string>

// Runs the lines of a page's blocks ```quarn with run(line), which gives the result, each block in a new scene; where a
// line promises "# gives VALUE", the result has to be that. Gives the number of promises.
template <class Run>
int comparePageExamples(std::istream& page, Run&& run) {
    const std::string promise = "# gives ";
    bool inExample = false;
    int compared = 0;
    for (std::string line; std::getline(page, line);) {
        if (line.starts_with("```")) {
            inExample = line == "```quarn";
            if (inExample)
                run("file -new");
            continue;
        }
        if (!inExample)
            continue;
        const std::string result = OpenQuarn::printedValue(run(line));
        if (const auto at = line.find(promise); at != std::string::npos) {
            EXPECT_EQ(result, line.substr(at + promise.size())) << line;
            ++compared;
        }
    }
    return compared;
}
