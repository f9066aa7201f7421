// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/colladaMeshes.h"

#include <pugixml.hpp>

#include <algorithm>
#include <charconv>
#include <optional>
#include <stdexcept>
#include <string>

namespace quarn {
namespace {

[[noreturn]] void refuse(const pugi::xml_node& node, const std::string& what) {
    throw std::runtime_error(std::string("the <") + node.name() + "> at byte " + std::to_string(node.offset_debug()) +
                             " " + what);
}

template <class Number>
std::vector<Number> numbersIn(const pugi::xml_node& node) {
    constexpr std::string_view spaces = " \t\r\n";
    std::string_view text = node.text().get();
    std::vector<Number> numbers;
    for (;;) {
        text.remove_prefix(std::min(text.find_first_not_of(spaces), text.size()));
        if (text.empty())
            return numbers;
        const auto read = std::from_chars(text.data(), text.data() + text.size(), numbers.emplace_back());
        text.remove_prefix(static_cast<std::size_t>(read.ptr - text.data()));
        if (read.ec != std::errc() || (!text.empty() && spaces.find(text[0]) == std::string_view::npos))
            refuse(node, "has something between its numbers");
    }
}

// the one of that name in the mesh whose id the attribute "source" gives
pugi::xml_node sourceOf(const pugi::xml_node& input, const pugi::xml_node& mesh, const char* name) {
    const std::string_view reference = input.attribute("source").value();
    const pugi::xml_node found =
        reference.starts_with('#') ? mesh.find_child_by_attribute(name, "id", reference.data() + 1) : pugi::xml_node();
    if (!found)
        refuse(input, "names no <" + std::string(name) + "> of its mesh");
    return found;
}

pugi::xml_node inputOf(const pugi::xml_node& node, const char* semantic) {
    return node.find_child_by_attribute("input", "semantic", semantic);
}

std::vector<double> pointsOf(const pugi::xml_node& vertices, const pugi::xml_node& mesh) {
    const pugi::xml_node position = inputOf(vertices, "POSITION");
    if (!position)
        refuse(vertices, "has no positions");
    const pugi::xml_node source = sourceOf(position, mesh, "source");
    const std::vector<double> numbers = numbersIn<double>(source.child("float_array"));
    const pugi::xml_node accessor = source.child("technique_common").child("accessor");
    const std::uint64_t count = accessor.attribute("count").as_uint();
    const std::uint64_t stride = accessor.attribute("stride").as_uint(1);
    const std::uint64_t offset = accessor.attribute("offset").as_uint();
    if (count == 0 || stride < 3 || offset + (count - 1) * stride + 3 > numbers.size())
        refuse(source, "has " + std::to_string(numbers.size()) + " numbers, too few for " + std::to_string(count) +
                           " positions");
    std::vector<double> points;
    points.reserve(3 * count);
    for (std::uint64_t i = 0; i < count; ++i)
        for (std::uint64_t axis = 0; axis < 3; ++axis)
            points.push_back(numbers[offset + i * stride + axis]);
    return points;
}

/// Adds the polygons of a mesh to its points, one element after another.
class PolygonReader {
public:
    explicit PolygonReader(ControlMesh& mesh)
        : mesh_(mesh) {}

    /// False when it is of a kind that is not read.
    bool read(const pugi::xml_node& element) {
        const std::string_view name = element.name();
        if (name == "lines" || name == "triangles")
            addEqual(element, name == "lines" ? 2 : 3);
        else if (name == "polylist")
            addCounted(element);
        else if (name == "polygons")
            addSingle(element);
        else
            return name != "linestrips" && name != "trifans" && name != "tristrips";
        return true;
    }

private:
    // of each corner the number that belongs to the vertices, among those for normals and so on
    std::size_t addCorners(const pugi::xml_node& element, const pugi::xml_node& p) {
        std::uint64_t stride = 1;
        for (const pugi::xml_node& input : element.children("input"))
            stride = std::max<std::uint64_t>(stride, input.attribute("offset").as_uint() + std::uint64_t{1});
        const std::uint64_t offset = inputOf(element, "VERTEX").attribute("offset").as_uint();
        const std::vector<std::uint32_t> numbers = numbersIn<std::uint32_t>(p);
        if (numbers.size() % stride != 0)
            refuse(p, "has " + std::to_string(numbers.size()) + " numbers, by " + std::to_string(stride));
        for (std::uint64_t at = offset; at < numbers.size(); at += stride) {
            if (numbers[at] >= mesh_.points.size() / 3)
                refuse(p,
                       "has vertex " + std::to_string(numbers[at]) + " of " + std::to_string(mesh_.points.size() / 3));
            mesh_.corners.push_back(numbers[at]);
        }
        return numbers.size() / stride;
    }
    void addEqual(const pugi::xml_node& element, std::uint32_t size) {
        const std::size_t corners = addCorners(element, element.child("p"));
        if (corners % size != 0)
            refuse(element, "has " + std::to_string(corners) + " corners, by " + std::to_string(size));
        mesh_.polygonSizes.insert(mesh_.polygonSizes.end(), corners / size, size);
    }
    void addCounted(const pugi::xml_node& element) {
        const std::size_t corners = addCorners(element, element.child("p"));
        std::uint64_t counted = 0;
        for (const std::uint32_t size : numbersIn<std::uint32_t>(element.child("vcount"))) {
            counted += size;
            mesh_.polygonSizes.push_back(size);
        }
        if (counted != corners)
            refuse(element, "counts " + std::to_string(counted) + " corners, and has " + std::to_string(corners));
    }
    void addSingle(const pugi::xml_node& element) {
        for (const pugi::xml_node& p : element.children("p"))
            mesh_.polygonSizes.push_back(static_cast<std::uint32_t>(addCorners(element, p)));
    }

    ControlMesh& mesh_;
};

// nothing for a mesh with strips or fans, and for one without points
std::optional<ControlMesh> meshOf(const pugi::xml_node& node) {
    const pugi::xml_node vertices = node.child("vertices");
    if (!vertices)
        return std::nullopt;
    ControlMesh mesh;
    mesh.points = pointsOf(vertices, node);
    PolygonReader polygons(mesh);
    for (const pugi::xml_node& element : node.children())
        if (!polygons.read(element))
            return std::nullopt;
    return mesh;
}

} // namespace

std::vector<ControlMesh> readColladaMeshes(std::string_view bytes) {
    pugi::xml_document document;
    const pugi::xml_parse_result parsed = document.load_buffer(bytes.data(), bytes.size());
    if (!parsed)
        throw std::runtime_error(std::string("at byte ") + std::to_string(parsed.offset) + ": " + parsed.description());
    std::vector<ControlMesh> meshes;
    for (const pugi::xml_node& library : document.child("COLLADA").children("library_geometries"))
        for (const pugi::xml_node& geometry : library.children("geometry"))
            if (std::optional<ControlMesh> mesh = meshOf(geometry.child("mesh")))
                meshes.push_back(std::move(*mesh));
    return meshes;
}

} // namespace quarn
