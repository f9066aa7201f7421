// SPDX-License-Identifier: Apache-2.0
#include "quarn/report/RowRequest.h"

#include "quarn/console/UsageError.h"
#include "quarn/console/numberText.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <functional>
#include <utility>

namespace quarn {
namespace {

namespace fs = std::filesystem;

// the name, empty for none, and the value
std::pair<std::string, std::string> split(const std::string& word) {
    const std::size_t equals = word.find('=');
    if (equals == std::string::npos || equals == 0 || word.find('/') < equals)
        return {"", word};
    return {word.substr(0, equals), word.substr(equals + 1)};
}

RowRequest rowOf(const std::string& word) {
    auto [name, scene] = split(word);
    RowRequest row;
    row.scene = scene;
    row.name = name.empty() ? row.scene.stem().string() : std::move(name);
    return row;
}

void requireOneEach(const std::vector<RowRequest>& rows) {
    for (auto row = rows.begin(); row != rows.end(); ++row)
        if (std::any_of(rows.begin(), row, [&](const RowRequest& other) { return other.name == row->name; }))
            throw UsageError("two rows are called \"" + row->name + "\": give names, as NAME=" + row->scene.string());
}

// what is for one row comes before what is for all
void give(std::vector<RowRequest>& rows, const char* flag, const std::vector<std::string>& words, bool isOfOne,
          const std::function<void(RowRequest&, const std::string&)>& set) {
    std::vector<std::string> given;
    for (const bool isNamed : {false, true})
        for (const std::string& word : words) {
            const auto [name, value] = split(word);
            if (name.empty() == isNamed)
                continue;
            if (std::find(given.begin(), given.end(), name) != given.end())
                throw UsageError(std::string(flag) + " is given twice" + (name.empty() ? "" : " for \"" + name + "\""));
            given.push_back(name);
            if (!isNamed && isOfOne && rows.size() > 1)
                throw UsageError(std::string(flag) + " " + value + ": of which row? Give it as NAME=" + value);
            bool isThere = false;
            for (RowRequest& row : rows)
                if (!isNamed || row.name == name) {
                    set(row, value);
                    isThere = true;
                }
            if (!isThere)
                throw UsageError(std::string(flag) + " " + word + ": there is no row \"" + name + "\"");
        }
}

} // namespace

std::string Limit::text() const {
    return isMillimetres ? numberText(value) + " mm" : numberText(std::round(1e4 * value) / 100.0) + " %";
}

Limit limitOf(const std::string& text) {
    Limit limit;
    const char* const end = text.data() + text.size();
    const auto [rest, error] = std::from_chars(text.data(), end, limit.value);
    const std::string unit(rest, end);
    const bool isNumber = error == std::errc() && std::isfinite(limit.value) && limit.value >= 0.0;
    if (!isNumber || !(unit.empty() || unit == "%" || unit == "mm"))
        throw UsageError("\"" + text +
                         "\" is no limit: write a part of what there is without the network, as 0.06 or "
                         "6%, or a distance, as 0.5mm");
    limit.isMillimetres = unit == "mm";
    limit.value /= unit == "%" ? 100.0 : 1.0;
    return limit;
}

std::vector<RowRequest> rowsOf(const RowWords& words) {
    std::vector<RowRequest> rows;
    for (const std::string& word : words.scenes)
        rows.push_back(rowOf(word));
    requireOneEach(rows);
    using Text = const std::string&;
    give(rows, "--deformer", words.deformers, false, [](RowRequest& row, Text text) { row.deformer = text; });
    give(rows, "--geometry", words.geometries, false, [](RowRequest& row, Text text) { row.geometry = text; });
    give(rows, "--model", words.models, false, [](RowRequest& row, Text text) { row.model = text; });
    give(rows, "--frames", words.frames, false, [](RowRequest& row, Text text) { row.frames = text; });
    give(rows, "--training", words.trainings, true, [](RowRequest& row, Text text) { row.training = text; });
    give(rows, "--evaluate", words.evaluations, true, [](RowRequest& row, Text text) { row.evaluation = text; });
    give(rows, "--limit-mean", words.means, false, [](RowRequest& row, Text text) { row.mean = limitOf(text); });
    give(rows, "--limit-max", words.maxima, false, [](RowRequest& row, Text text) { row.max = limitOf(text); });
    return rows;
}

} // namespace quarn
