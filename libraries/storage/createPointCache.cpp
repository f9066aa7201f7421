// SPDX-License-Identifier: Apache-2.0
#include "storage/CacheFormat.h"
#include "storage/NpyWriter.h"
#include "storage/mddHead.h"
#include "storage/npyHeader.h"
#include "storage/pc2Head.h"
#include "storage/zipArchive.h"

#include <bit>
#include <stdexcept>
#include <string>
#include <vector>

#include <zlib.h>

namespace storage {
namespace {

constexpr const char* memberName = "arr_0.npy"; // as numpy.savez calls an array without a name

/// One stored array in an archive, as numpy.savez writes it.
class NpzWriter final : public PointCacheWriter {
public:
    NpzWriter(const std::string& path, std::size_t vertexCount)
        : PointCacheWriter(path, vertexCount, zipFrameStart(memberName) + npyHeadSize) {}

private:
    Frame frame() const override {
        const std::string head = makeNpyHead(frameCount(), vertexCount());
        const uLong sum = crc32(0, reinterpret_cast<const Bytef*>(head.data()), static_cast<uInt>(head.size()));
        const std::uint64_t size = std::uint64_t{12} * frameCount() * vertexCount();
        const auto both = static_cast<std::uint32_t>(crc32_combine(sum, pointsSum_, static_cast<z_off_t>(size)));
        ZipFrame archive = makeZipFrame(memberName, both, head.size() + size);
        return {archive.before + head, std::move(archive.behind)};
    }
    void writePoints(WholeFile& file, std::span<const float> xyz) override {
        file.write(std::as_bytes(xyz));
        pointsSum_ = crc32_z(pointsSum_, reinterpret_cast<const Bytef*>(xyz.data()), xyz.size_bytes());
    }

    uLong pointsSum_ = crc32(0, nullptr, 0);
};

class Pc2Writer final : public PointCacheWriter {
public:
    Pc2Writer(const std::string& path, std::size_t vertexCount, const CacheTiming& timing)
        : PointCacheWriter(path, vertexCount, pc2HeadSize)
        , timing_(timing) {}

private:
    Frame frame() const override {
        return {makePc2Head(vertexCount(), frameCount(), static_cast<float>(timing_.firstFrame),
                            static_cast<float>(timing_.frameStep)),
                ""};
    }

    CacheTiming timing_;
};

std::vector<float> secondsOf(const CacheTiming& timing) {
    std::vector<float> seconds(timing.frameCount);
    for (std::size_t i = 0; i < seconds.size(); ++i)
        seconds[i] = static_cast<float>((timing.firstFrame + static_cast<double>(i) * timing.frameStep) /
                                        timing.framesPerSecond);
    return seconds;
}

class MddWriter final : public PointCacheWriter {
public:
    MddWriter(const std::string& path, std::size_t vertexCount, const CacheTiming& timing)
        : PointCacheWriter(path, vertexCount, mddCountsSize + 4 * timing.frameCount)
        , timing_(timing) {}

private:
    Frame frame() const override {
        if (frameCount() != timing_.frameCount) // the points lie behind so many times
            throw std::logic_error("an MDD cache that was to get " + std::to_string(timing_.frameCount) +
                                   " frames has got " + std::to_string(frameCount()));
        return {makeMddHead(vertexCount(), secondsOf(timing_)), ""};
    }
    void writePoints(WholeFile& file, std::span<const float> xyz) override {
        swapped_.resize(xyz.size());
        for (std::size_t i = 0; i < xyz.size(); ++i)
            swapped_[i] = __builtin_bswap32(std::bit_cast<std::uint32_t>(xyz[i]));
        file.write(std::as_bytes(std::span(swapped_)));
    }

    CacheTiming timing_;
    std::vector<std::uint32_t> swapped_;
};

void requireAtMost(std::uint64_t most, const std::string& path, std::uint64_t count, const char* what) {
    if (count > most)
        throw std::runtime_error("point cache '" + path + "' cannot be written: it is to have " +
                                 std::to_string(count) + " " + what + ", and its format knows at most " +
                                 std::to_string(most) + ": write .npy");
}

} // namespace

std::unique_ptr<PointCacheWriter> createPointCache(const std::string& path, std::size_t vertexCount,
                                                   const CacheTiming& timing) {
    const std::optional<CacheFormat> format = cacheFormatOf(path);
    if (!format || *format == CacheFormat::obj)
        throw std::runtime_error("point cache '" + path +
                                 "' cannot be written: the name of a point cache in one file ends in .npy, .npz, .pc2 "
                                 "or .mdd");
    if (*format == CacheFormat::npy)
        return std::make_unique<NpyWriter>(path, vertexCount);
    if (*format == CacheFormat::npz)
        return std::make_unique<NpzWriter>(path, vertexCount);
    static_assert(pc2MostOfAKind == mddMostOfAKind);
    requireAtMost(pc2MostOfAKind, path, vertexCount, "vertices");
    requireAtMost(pc2MostOfAKind, path, timing.frameCount, "frames");
    if (*format == CacheFormat::pc2)
        return std::make_unique<Pc2Writer>(path, vertexCount, timing);
    return std::make_unique<MddWriter>(path, vertexCount, timing);
}

} // namespace storage
