// SPDX-License-Identifier: Apache-2.0
#include "gpu/Chain.h"

#include "geometry/filterAttributes.h"
#include "geometry/filterEvaluation.h"
#include "graph/Context.h"
#include "graph/arrayLock.h"
#include "openquarn/HPxDeformerNode.h"

#include <algorithm>

namespace OpenQuarn {
namespace {

std::shared_ptr<Slot> slotOfField(const NodeData& data, const Field& field, unsigned index) {
    std::shared_ptr<Slot> slot;
    if (!field.parent)
        slot = data.slot(field);
    else if (const std::shared_ptr<Slot> above = slotOfField(data, *field.parent, index))
        slot = above->child(field);
    if (!slot || !slot->isArray())
        return slot;
    const ArrayReadLock lock(slot->owner);
    return slot->elements().find(index);
}

/// The plug-in says so.
bool isDueOnCpu(NodeData& data, unsigned index) {
    auto* deformer = dynamic_cast<HPxDeformerNode*>(data.node.userNode());
    if (!deformer)
        return false;
    bool isDue = true; // also when it throws
    auto block = Access::make<HDataBlock>(data.shared_from_this());
    callPlugin(data.node, "isDueOnCpu", [&] {
        isDue = deformer->isDueOnCpu(block, index);
        return HStatus();
    });
    return isDue;
}

/// The geometry as a link, as far as can be told without its mesh; none when it has to be evaluated on the CPU.
std::optional<Link> linkOf(NodeData& data, unsigned index) {
    const FilterAttributes& attributes = filterAttributes();
    Link link;
    link.node = std::static_pointer_cast<Node>(data.node.shared_from_this());
    link.data = data.shared_from_this();
    link.index = index;
    link.state = filterStateOf(data).geometry(index);
    link.input = elementOf(data, *attributes.input, index);
    link.output = elementOf(data, *attributes.outputGeom, index);
    if (!link.input || !link.output || !link.state->onDevice || !link.state->onDevice->isPrimed)
        return {};
    link.geometry = childOf(*link.input, *attributes.inputGeometry);
    if (primingValues(data, index) != link.gpu().primedValues || isDueOnCpu(data, index))
        return {};
    return link;
}

/// The output that a link takes its geometry from, where nobody else does and it has to be evaluated; else null.
std::shared_ptr<Slot> outputBefore(const Link& link) {
    std::shared_ptr<Slot> source = sourceInContext(*link.geometry);
    const bool isOutput = source && source->owner && source->isElement &&
                          source->owner->node.kind() == HFn::kGeometryFilter &&
                          source->field.attribute == filterAttributes().outputGeom;
    if (!isOutput || source->links->destinations.size() != 1 || source->parent->hasDestinations() ||
        !source->mayBeDirty())
        return nullptr;
    return source;
}

/// Goes up from the last link.
std::vector<Link> linksUpFrom(Link last) {
    std::vector<Link> upwards;
    upwards.push_back(std::move(last));
    while (const std::shared_ptr<Slot> before = outputBefore(upwards.back())) {
        auto claim = std::make_unique<ComputeClaim>(*before);
        std::optional<Link> link;
        if (before->mayBeDirty()) // else another thread was faster
            link = linkOf(*before->owner, before->index);
        if (!link)
            break;
        link->claim = std::move(claim);
        upwards.push_back(std::move(*link));
    }
    std::reverse(upwards.begin(), upwards.end());
    return upwards;
}

/// Takes the affected vertices of a mesh with these polygons and tags; false, and no longer primed, when what the
/// geometry's first state was built from is no longer the same.
bool fits(Link& link, const MeshData& mesh) {
    HStatus status;
    const std::optional<GeometrySources> now = sourcesOf(*link.data, link.index, *link.input, mesh, status);
    if (!now || link.state->isStale(*now)) {
        link.gpu().isPrimed = false;
        return false;
    }
    link.affected = now->affected;
    return true;
}

/// Leaves out the links up to the last that has to be evaluated on the CPU. True when there was none.
bool dropUnfit(Chain& chain) {
    std::size_t unfit = 0;
    for (std::size_t i = 0; i < chain.links.size(); ++i)
        if (!fits(chain.links[i], *chain.mesh))
            unfit = i + 1;
    chain.links.erase(chain.links.begin(), chain.links.begin() + static_cast<std::ptrdiff_t>(unfit));
    return unfit == 0;
}

} // namespace

GpuGeometry& Link::gpu() const {
    return static_cast<GpuGeometry&>(*state->onDevice); // nobody else makes one
}

std::optional<Chain> findChain(NodeData& data, unsigned index) {
    std::optional<Link> last = linkOf(data, index);
    if (!last)
        return {};
    Chain chain;
    chain.links = linksUpFrom(std::move(*last));
    do {
        chain.mesh = evaluatedMesh(chain.links.front().geometry);
        if (!chain.mesh)
            return {};
    } while (!dropUnfit(chain) && !chain.links.empty());
    return chain.links.empty() ? std::nullopt : std::optional<Chain>(std::move(chain));
}

std::shared_ptr<Slot> slotOfGeometry(const NodeData& data, const HObject& attribute, unsigned index) {
    const auto known = Access::as<Attribute>(attribute);
    const Field* field = known ? data.node.type().find(*known) : nullptr;
    return field ? slotOfField(data, *field, index) : nullptr;
}

std::vector<std::optional<double>> primingValues(const NodeData& data, unsigned index) {
    HObjectArray attributes;
    attributes.append(HPxGeometryFilter::envelope);
    if (const auto* deformer = dynamic_cast<const HPxDeformerNode*>(data.node.userNode()))
        callPlugin(data.node, "primingAttributes", [&] {
            deformer->primingAttributes(attributes);
            return HStatus();
        });
    std::vector<std::optional<double>> values;
    values.reserve(attributes.length());
    for (const HObject& attribute : attributes) {
        const std::shared_ptr<Slot> slot = slotOfGeometry(data, attribute, index);
        if (slot)
            pull(slot);
        values.push_back(slot ? std::optional<double>(slot->number) : std::nullopt);
    }
    return values;
}

} // namespace OpenQuarn
