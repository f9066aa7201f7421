// SPDX-License-Identifier: Apache-2.0
#include "storage/npyArray.h"

#include "storage/FileError.h"
#include "storage/WholeFile.h"
#include "storage/npyHeader.h"
#include "storage/readWholeFile.h"

#include <algorithm>
#include <stdexcept>

namespace storage {
namespace {

using Shape = std::vector<std::uint64_t>;

[[noreturn]] void fail(const std::filesystem::path& path, const std::string& why) {
    throw std::runtime_error("array '" + path.string() + "' cannot be read: " + why);
}

struct Body {
    Shape shape;
    std::string_view numbers; ///< of 4 bytes each, as many as the shape says
};

// what follows the header, once it is found to be as long as the shape says
Body bodyOf(std::string_view bytes, const std::string& descr, std::size_t dimensions) {
    const NpyPlace place = findNpyHeader(bytes.substr(0, npyPreambleSize));
    if (place.start + place.length > bytes.size())
        throw std::runtime_error("it is cut short within its header");
    const NpyArray array = parseNpyArray(bytes.substr(place.start, place.length));
    if (array.descr != descr || array.shape.size() != dimensions)
        throw std::runtime_error("it has numbers '" + array.descr + "' in the shape " + npyShapeText(array.shape) +
                                 ", where '" + descr + "' in " + std::to_string(dimensions) +
                                 (dimensions == 1 ? " dimension is" : " dimensions are") + " expected");
    const std::string_view numbers = bytes.substr(place.start + place.length);
    requireNpySize(array, sizeof(float), numbers.size());
    return {array.shape, numbers};
}

template <class Number>
Shape read(const std::filesystem::path& path, const char* descr, std::size_t dimensions, std::vector<Number>& values) {
    try {
        const std::string bytes = readWholeFile(path, npyArrayFileLimit);
        const Body body = bodyOf(bytes, descr, dimensions);
        values.resize(body.numbers.size() / sizeof(Number));
        std::copy(body.numbers.begin(), body.numbers.end(), reinterpret_cast<char*>(values.data()));
        return body.shape;
    } catch (const FileError& error) {
        fail(path, "it " + error.predicate());
    } catch (const std::runtime_error& error) {
        fail(path, error.what());
    }
}

template <class Number>
void write(const std::filesystem::path& path, const char* descr, const Shape& shape, std::span<const Number> values) {
    WholeFile file(path);
    file.stream() << makeNpyHead(descr, shape);
    file.stream().write(reinterpret_cast<const char*>(values.data()),
                        static_cast<std::streamsize>(values.size_bytes()));
    file.finish();
}

} // namespace

FloatTable readFloatTable(const std::filesystem::path& path) {
    FloatTable table;
    const Shape shape = read(path, "<f4", 2, table.values);
    table.rows = shape[0];
    table.columns = shape[1];
    return table;
}

std::vector<std::int32_t> readIntegers(const std::filesystem::path& path) {
    std::vector<std::int32_t> values;
    read(path, "<i4", 1, values);
    return values;
}

void writeFloatTable(const std::filesystem::path& path, const FloatTable& table) {
    write<float>(path, "<f4", {table.rows, table.columns}, table.values);
}

void writeIntegers(const std::filesystem::path& path, std::span<const std::int32_t> values) {
    write(path, "<i4", {values.size()}, values);
}

} // namespace storage
