// SPDX-License-Identifier: Apache-2.0
#include "quarn/dataset/rowSums.h"

#include "quarn/scene/PartRecord.h"
#include "storage/ArrayFile.h"

#include <vector>

namespace quarn {
namespace {

std::vector<std::byte> firstRowOf(const std::filesystem::path& file, std::size_t bytes) {
    std::vector<std::byte> row(bytes);
    storage::ArrayFile(file).read(0, row);
    return row;
}

} // namespace

std::string rowSum(int frame, std::span<const float> controls, std::span<const float> deltas,
                   std::span<const float> skin) {
    return rowSum(
        {std::as_bytes(std::span(&frame, 1)), std::as_bytes(controls), std::as_bytes(deltas), std::as_bytes(skin)});
}

std::string firstRowSum(const std::filesystem::path& folder, const DatasetShape& shape) {
    constexpr std::size_t number = 4;
    return rowSum({firstRowOf(folder / datasetFile::frames, number),
                   firstRowOf(folder / datasetFile::controls, number * shape.controls),
                   firstRowOf(folder / datasetFile::deltas, 3 * number * shape.deltas),
                   firstRowOf(folder / datasetFile::skin, number * shape.deltas)});
}

} // namespace quarn
