// SPDX-License-Identifier: Apache-2.0
#include "quarn/dataset/DatasetWriter.h"

#include <stdexcept>

namespace quarn {

DatasetWriter::DatasetWriter(const std::filesystem::path& folder, const DatasetShape& shape)
    : RecordedRows(folder, {{datasetFile::controls, {"<f4", {shape.rows, shape.controls}}},
                            {datasetFile::deltas, {"<f4", {shape.rows, shape.deltas, 3}}},
                            {datasetFile::frames, {"<i4", {shape.rows}}},
                            {datasetFile::skin, {"<f4", {shape.rows, shape.deltas}}}})
    , shape_(shape) {}

void DatasetWriter::append(int frame, std::span<const float> controls, std::span<const float> deltas,
                           std::span<const float> skin) {
    if (controls.size() != shape_.controls || deltas.size() != 3 * shape_.deltas || skin.size() != shape_.deltas)
        throw std::logic_error("a row that the data set has no place for");
    RecordedRows::append(
        {std::as_bytes(controls), std::as_bytes(deltas), std::as_bytes(std::span(&frame, 1)), std::as_bytes(skin)});
}

} // namespace quarn
