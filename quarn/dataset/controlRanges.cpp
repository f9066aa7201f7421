// SPDX-License-Identifier: Apache-2.0
#include "quarn/dataset/controlRanges.h"

#include "quarn/dataset/exactNumbers.h"
#include "storage/npyHeader.h"

#include <algorithm>
#include <fstream>
#include <stdexcept>

namespace quarn {

std::vector<ControlRange> controlRanges(const std::filesystem::path& controls, const DatasetShape& shape) {
    std::ifstream file(controls, std::ios::binary);
    file.seekg(storage::npyHeadSize);
    std::vector<ControlRange> ranges(shape.controls);
    std::vector<float> row(shape.controls);
    for (std::size_t number = 0; number < shape.rows; ++number) {
        file.read(reinterpret_cast<char*>(row.data()), static_cast<std::streamsize>(row.size() * sizeof(float)));
        for (std::size_t i = 0; i < row.size(); ++i) {
            const ControlRange before = number == 0 ? ControlRange{row[i], row[i]} : ranges[i];
            ranges[i] = {std::min(before.least, row[i]), std::max(before.largest, row[i])};
        }
    }
    if (!file)
        throw std::runtime_error(controls.string() + " could not be read");
    return ranges;
}

void writeRanges(JsonWriter& writer, const std::vector<ControlRange>& ranges) {
    writer.StartArray();
    for (const ControlRange& range : ranges) {
        writer.StartArray();
        writeNumber(writer, range.least);
        writeNumber(writer, range.largest);
        writer.EndArray();
    }
    writer.EndArray();
}

} // namespace quarn
