// SPDX-License-Identifier: Apache-2.0
#include "storage/PointCache.h"

#include "storage/FileError.h"
#include "storage/byteOrder.h"

#include <algorithm>
#include <array>
#include <bit>
#include <cerrno>
#include <cmath>
#include <stdexcept>

#include <fcntl.h>

namespace storage {
namespace {

CacheLayout layoutOf(CacheFormat format, const FileBytes& file) {
    switch (format) {
    case CacheFormat::npz:
        return npzLayout(file);
    case CacheFormat::pc2:
        return pc2Layout(file);
    case CacheFormat::mdd:
        return mddLayout(file);
    case CacheFormat::npy:
    case CacheFormat::obj: // is no file with a layout
        break;
    }
    return npyLayout(file);
}

} // namespace

// a pipe would wait for somebody who writes into it: O_NONBLOCK opens it at once, and then it is refused
PointCache::PointCache(const std::string& path, CacheFormat format)
    : path_(path)
    , format_(format)
    , file_(format == CacheFormat::obj ? -1 : ::open(path.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC)) {
    if (!file_.isOpen() && format != CacheFormat::obj)
        fail(textOfErrno(errno));
    try {
        if (format == CacheFormat::obj) {
            identity_ = identityOf(path).value_or(FileIdentity()); // before it is read: what comes later is a change
            layout_ = objLayout(path);
            return;
        }
        identity_ = identityOf(file_.number());
        layout_ = layoutOf(format, {file_.number(), 0, identity_.size});
    } catch (const std::runtime_error& error) {
        fail(error.what());
    }
}

std::optional<double> PointCache::secondsOf(std::size_t frame) const {
    if (layout_.times.size == 0)
        return std::nullopt;
    if (frame >= frameCount())
        throw std::out_of_range("'" + path_ + "' has no frame " + std::to_string(frame));
    std::string bytes(sizeof(float), '\0');
    readBytes(layout_.times, frame * sizeof(float), std::as_writable_bytes(std::span(bytes)));
    const auto seconds = bigAt<float>(bytes, 0);
    if (!std::isfinite(seconds))
        fail("the time of its frame " + std::to_string(frame) + " is no finite number");
    return seconds;
}

void PointCache::read(std::size_t frame, std::size_t firstVertex, std::span<double> xyz) const {
    const std::size_t count = xyz.size() / 3;
    if (frame >= frameCount() || firstVertex > vertexCount() || count > vertexCount() - firstVertex)
        throw std::out_of_range("'" + path_ + "' has no vertices " + std::to_string(firstVertex) + " to " +
                                std::to_string(firstVertex + count) + " in a frame " + std::to_string(frame));
    // none of this can overflow: it lies within the file
    const std::uint64_t place = (frame * vertexCount() + firstVertex) * 3 * layout_.scalarSize;
    if (layout_.scalarSize == sizeof(double))
        readBytes(layout_.points, place, std::as_writable_bytes(xyz));
    else
        readSingles(place, xyz);
}

void PointCache::readSingles(std::uint64_t place, std::span<double> xyz) const {
    std::array<std::uint32_t, 12288> singles; // 48 KiB: stays in the first cache
    while (!xyz.empty()) {
        const auto part = std::span(singles).first(std::min(singles.size(), xyz.size()));
        readBytes(layout_.points, place, std::as_writable_bytes(part));
        if (layout_.isBigEndian)
            for (std::uint32_t& bits : part)
                bits = __builtin_bswap32(bits);
        std::transform(part.begin(), part.end(), xyz.begin(),
                       [](std::uint32_t bits) { return std::bit_cast<float>(bits); });
        xyz = xyz.subspan(part.size());
        place += part.size_bytes();
    }
}

void PointCache::readBytes(const FileBytes& from, std::uint64_t place, std::span<std::byte> bytes) const {
    try {
        from.read(place, bytes);
    } catch (const std::runtime_error& error) {
        fail(error.what());
    }
}

void PointCache::fail(const std::string& why) const {
    throw std::runtime_error("point cache '" + path_ + "' cannot be read: " + why);
}

std::unique_ptr<PointCache> openPointCache(const std::string& path) {
    const std::optional<CacheFormat> format = cacheFormatOf(path);
    if (!format)
        throw std::runtime_error("point cache '" + path + "' cannot be read: the name of a point cache ends in " +
                                 cacheEndings);
    return std::make_unique<PointCache>(path, *format);
}

} // namespace storage
