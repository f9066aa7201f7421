// SPDX-License-Identifier: Apache-2.0
#include "quarn/report/html.h"

#include "quarn/report/escaped.h"

#include <locale>
#include <sstream>

namespace quarn {

std::string with(const std::string& element, const std::string& html, const std::string& kind) {
    return "<" + element + (kind.empty() ? "" : " class=\"" + kind + "\"") + ">" + html + "</" + element + ">";
}

std::string said(const std::string& element, const std::string& text, const std::string& kind) {
    return with(element, escaped(text), kind);
}

std::string fixedText(double value, int decimals) {
    std::ostringstream text;
    text.imbue(std::locale::classic());
    text.setf(std::ios::fixed);
    text.precision(decimals);
    text << value;
    return text.str();
}

std::string sizeText(std::uint64_t bytes) {
    constexpr double kilo = 1000.0;
    const auto size = static_cast<double>(bytes);
    if (size < kilo)
        return counted(bytes, "byte");
    if (size < kilo * kilo)
        return fixedText(size / kilo, size < 10.0 * kilo ? 1 : 0) + " kB";
    return fixedText(size / kilo / kilo, 1) + " MB";
}

std::string counted(std::uint64_t count, const char* what) {
    const std::string word = what;
    const bool isHiss = word.size() > 1 && word.substr(word.size() - 2) == "ss"; // passes
    return std::to_string(count) + " " + word + (count == 1 ? "" : isHiss ? "es" : "s");
}

} // namespace quarn
