// SPDX-License-Identifier: Apache-2.0
// Words read as values. Each fails with kFailure and a sentence that quotes the word; the value is left alone then.
#pragma once

#include "core/text.h"
#include "openquarn/HStatus.h"
#include "openquarn/HString.h"

#include <string>
#include <string_view>

namespace OpenQuarn {

HStatus readWord(const std::string& word, bool& value);
HStatus readWord(const std::string& word, int& value);
HStatus readWord(const std::string& word, unsigned& value);
HStatus readWord(const std::string& word, double& value);
HStatus readWord(const std::string& word, HString& value);

/// 'text', cut where it is long.
std::string inQuotes(std::string_view text);

} // namespace OpenQuarn
