// SPDX-License-Identifier: Apache-2.0
#include "nw_model/TrainedPoses.h"

#include "storage/fileSum.h"
#include "storage/finite.h"
#include "storage/npyArray.h"

#include <cmath>
#include <limits>
#include <stdexcept>
#include <utility>

namespace neuralWarp {

TrainedPoses::TrainedPoses(const ControlRanges& ranges, std::vector<float> values)
    : values_(std::move(values)) {
    for (std::size_t control = 0; control < ranges.count(); ++control)
        units_.push_back(ranges.unit(control));
}

TrainedPoses TrainedPoses::read(const std::filesystem::path& directory, const ModelCertificate& certificate) {
    if (certificate.trainedPosesSum.empty())
        return {};
    const std::filesystem::path path = directory / "trained_poses.npy";
    if (storage::sumOfFile(path, trainedPosesFileLimit, 0).digits != certificate.trainedPosesSum)
        throw std::runtime_error("trained_poses.npy is not the one of this model: its sum is another");
    storage::FloatTable table = storage::readFloatTable(path);
    if (table.rows == 0 || table.rows > trainedPosesLimit || table.columns != certificate.ranges.count())
        throw std::runtime_error("trained_poses.npy has the shape [" + std::to_string(table.rows) + ", " +
                                 std::to_string(table.columns) + "], and may have 1 to " +
                                 std::to_string(trainedPosesLimit) + " poses of " +
                                 std::to_string(certificate.ranges.count()) + " controls");
    if (storage::firstNotFinite(table.values))
        throw std::runtime_error("trained_poses.npy holds a number that is not finite");
    return {certificate.ranges, std::move(table.values)};
}

double TrainedPoses::distance(std::span<const float> controls) const {
    const std::size_t size = units_.size();
    double nearest = std::numeric_limits<double>::infinity();
    for (std::size_t first = 0; first < values_.size(); first += size) {
        double squares = 0.0;
        for (std::size_t i = 0; i < size && squares < nearest; ++i) {
            const double difference = (double{controls[i]} - double{values_[first + i]}) / units_[i];
            squares += difference * difference;
        }
        if (squares < nearest)
            nearest = squares;
    }
    return std::sqrt(nearest / static_cast<double>(size));
}

} // namespace neuralWarp
