// SPDX-License-Identifier: Apache-2.0
// A head of 27 bytes, the last four of which are the version, then records. A record is three numbers (where it ends,
// how many values it has, how many bytes these take), of 32 bits before version 7.5 and of 64 from there on, the length
// of its name in a byte, the name, its values, and the records in it, behind which comes one of zeros.
#include "quarn/character/fbxArrays.h"

#include "storage/byteOrder.h"
#include "storage/unpackZlib.h"

#include <cstring>
#include <stdexcept>
#include <string>

namespace quarn {
namespace {

[[noreturn]] void damaged(const std::string& what) {
    throw std::runtime_error("its records are damaged: " + what);
}

struct Record {
    std::string_view name, values, records;
};

/// The records in a piece of the file, one after another.
class RecordList {
public:
    /// `piece` begins at byte `begin` of the file: records say where in the file they end.
    RecordList(std::string_view piece, std::size_t begin, bool isWide)
        : piece_(piece)
        , begin_(begin)
        , isWide_(isWide) {}

    /// False behind the last.
    bool next(Record& record) {
        const std::size_t numbers = isWide_ ? 24 : 12;
        if (piece_.empty())
            return false;
        if (piece_.size() < numbers + 1)
            damaged("one is cut off at byte " + std::to_string(begin_));
        const std::uint64_t end = number(0);
        if (end == 0)
            return false;
        const std::uint64_t valueBytes = number(2);
        const std::size_t head = numbers + 1 + static_cast<unsigned char>(piece_[numbers]);
        if (end < begin_ || end - begin_ > piece_.size() || end - begin_ < head || valueBytes > end - begin_ - head)
            damaged("the one at byte " + std::to_string(begin_) + " ends at " + std::to_string(end));
        const std::size_t size = end - begin_;
        record.name = piece_.substr(numbers + 1, head - numbers - 1);
        record.values = piece_.substr(head, valueBytes);
        record.records = piece_.substr(head + valueBytes, size - head - valueBytes);
        recordsBegin_ = begin_ + head + valueBytes;
        piece_.remove_prefix(size);
        begin_ += size;
        return true;
    }

    /// Those in the record that next() has given last.
    RecordList within(const Record& record) const { return {record.records, recordsBegin_, isWide_}; }

private:
    std::uint64_t number(std::size_t which) const {
        return isWide_ ? storage::littleAt<std::uint64_t>(piece_, 8 * which)
                       : storage::littleAt<std::uint32_t>(piece_, 4 * which);
    }

    std::string_view piece_;
    std::size_t begin_;
    std::size_t recordsBegin_ = 0;
    bool isWide_;
};

template <class Number>
std::vector<Number> numbersOf(std::string_view bytes) {
    std::vector<Number> numbers(bytes.size() / sizeof(Number));
    if (!numbers.empty())
        std::memcpy(numbers.data(), bytes.data(), numbers.size() * sizeof(Number));
    return numbers;
}

// a value that is an array: its type, its count, whether it is packed, how many bytes follow, and these
template <class Number>
std::vector<Number> arrayOf(const Record& record, char type) {
    constexpr std::size_t head = 13;
    const std::string name(record.name);
    if (record.values.size() < head || record.values[0] != type)
        damaged(name + " is no array of the type '" + type + "'");
    const std::uint64_t size = sizeof(Number) * std::uint64_t{storage::littleAt<std::uint32_t>(record.values, 1)};
    const auto encoding = storage::littleAt<std::uint32_t>(record.values, 5);
    const std::string_view bytes = record.values.substr(head);
    if (bytes.size() != storage::littleAt<std::uint32_t>(record.values, 9) || encoding > 1)
        damaged(name + " has another size than it says");
    if (encoding == 1)
        return numbersOf<Number>(storage::unpackZlib(bytes, size));
    if (bytes.size() != size)
        damaged(name + " has another size than it says");
    return numbersOf<Number>(bytes);
}

std::vector<double> verticesOf(const Record& record) {
    if (!record.values.starts_with('f'))
        return arrayOf<double>(record, 'd');
    const std::vector<float> singles = arrayOf<float>(record, 'f');
    return {singles.begin(), singles.end()};
}

FbxArrays geometryOf(RecordList list) {
    FbxArrays arrays;
    Record record;
    while (list.next(record)) {
        if (record.name == "Vertices")
            arrays.vertices = verticesOf(record);
        else if (record.name == "PolygonVertexIndex")
            arrays.polygonVertexIndex = arrayOf<std::int32_t>(record, 'i');
    }
    return arrays;
}

} // namespace

std::vector<FbxArrays> readFbxBinary(std::string_view bytes) {
    constexpr std::size_t head = 27;
    constexpr std::uint32_t firstWideVersion = 7500;
    if (bytes.size() < head)
        damaged("there are none");
    const bool isWide = storage::littleAt<std::uint32_t>(bytes, head - 4) >= firstWideVersion;
    std::vector<FbxArrays> geometries;
    RecordList file(bytes.substr(head), head, isWide);
    Record section, object;
    while (file.next(section)) {
        if (section.name != "Objects")
            continue;
        RecordList objects = file.within(section);
        while (objects.next(object))
            if (object.name == "Geometry")
                geometries.push_back(geometryOf(objects.within(object)));
    }
    return geometries;
}

} // namespace quarn
