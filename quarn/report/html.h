// SPDX-License-Identifier: Apache-2.0
// Elements and numbers of a page.
#pragma once

#include <cstdint>
#include <string>

namespace quarn {

/// An element around what is HTML already; `kind` is its class.
std::string with(const std::string& element, const std::string& html, const std::string& kind = {});
/// An element around a text.
std::string said(const std::string& element, const std::string& text, const std::string& kind = {});

std::string fixedText(double value, int decimals);
/// "812 bytes", "4.2 kB", "1.8 MB"
std::string sizeText(std::uint64_t bytes);
/// "1 frame", "3 frames"
std::string counted(std::uint64_t count, const char* what);

} // namespace quarn
