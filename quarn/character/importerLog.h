// SPDX-License-Identifier: Apache-2.0
// What the importer complains of while it reads a file.
#pragma once

#include <string>
#include <vector>

namespace quarn {

/// Collects the importer's warnings as long as it lives. The importer has one log in the process: one ImporterLog at a
/// time.
class ImporterLog {
public:
    /// `warnings`, which must live as long, gets the sentences.
    explicit ImporterLog(std::vector<std::string>& warnings);
    ~ImporterLog();
    ImporterLog(const ImporterLog&) = delete;
    ImporterLog& operator=(const ImporterLog&) = delete;
};

} // namespace quarn
