// SPDX-License-Identifier: Apache-2.0
#include "geometry/GeometryFilterState.h"

#include "geometry/filterAttributes.h"
#include "graph/arrayLock.h"
#include "graph/values.h"

#include <stdexcept>

namespace OpenQuarn {
namespace {

bool sameConnection(const std::weak_ptr<Slot>& a, const std::weak_ptr<Slot>& b) {
    return !a.owner_before(b) && !b.owner_before(a);
}

bool sameTopology(const std::shared_ptr<const Topology>& a, const std::shared_ptr<const Topology>& b) {
    return a == b || (a && b && *a == *b);
}

bool samePoints(const std::shared_ptr<const Positions>& a, const std::shared_ptr<const Positions>& b) {
    return a == b || (a && b && a->sameAs(*b));
}

/// The field of the slot, or the nearest one above it, is that of the attribute.
bool isAtOrBelow(const Slot& slot, const Attribute& attribute) {
    for (const Field* field = &slot.field; field; field = field->parent)
        if (field->attribute.get() == &attribute)
            return true;
    return false;
}

bool holdsGeometry(const Slot& inputElement) {
    const std::shared_ptr<Slot>& geometry = inputElement.children().front();
    return geometry->data || geometry->source() || inputElement.source();
}

} // namespace

bool GeometrySources::sameAs(const GeometrySources& other) const {
    return sameConnection(inputConnection, other.inputConnection) &&
           sameConnection(restConnection, other.restConnection) && expression == other.expression &&
           (affected == other.affected || *affected == *other.affected) && sameTopology(input, other.input) &&
           sameTopology(rest, other.rest) && samePoints(restPoints, other.restPoints);
}

// --- GeometryState ---

std::shared_ptr<const IndexMap> GeometryState::affectedVertices(const MeshData& mesh,
                                                                const std::shared_ptr<Data>& expression) {
    const std::scoped_lock lock(mutex_);
    if (affected_ && affected_->fullCount == mesh.vertexCount() && tags_ == mesh.tags && expression_ == expression)
        return affected_;
    const auto* text = dynamic_cast<const StringData*>(expression.get());
    std::shared_ptr<const IndexMap> found = resolveExpression(mesh, text ? text->value : std::string());
    // an equal map stays the one that others have been gathered for
    if (found && !(affected_ && *affected_ == *found))
        affected_ = found;
    if (!found)
        affected_ = nullptr;
    tags_ = mesh.tags;
    expression_ = expression;
    return affected_;
}

void GeometryState::initializedFrom(GeometrySources sources) {
    sources_ = std::move(sources);
    initialized_ = true;
}

const float* GeometryState::weights(const Slot* list, const std::shared_ptr<const IndexMap>& affected) {
    if (weightsMap_ != affected) {
        weights_.clear();
        const ArrayReadLock lock(list ? list->owner : nullptr);
        if (list && !list->elements().empty()) {
            std::vector<float> all(affected->fullCount, 1.0F);
            list->elements().forEach([&](unsigned vertex, const std::shared_ptr<Slot>& weight) {
                if (vertex < all.size())
                    all[vertex] = static_cast<float>(weight->number);
            });
            if (affected->isIdentity()) {
                weights_ = std::move(all);
            } else {
                weights_.reserve(affected->affectCount());
                for (const unsigned vertex : *affected->affected)
                    weights_.push_back(all[vertex]);
            }
        }
        weightsMap_ = affected;
        ++weightsVersion_;
    }
    return weights_.empty() ? nullptr : weights_.data();
}

// --- GeometryFilterState ---

void GeometryFilterState::changed(Slot& slot) {
    const FilterAttributes& attributes = filterAttributes();
    if (isAtOrBelow(slot, *attributes.weightList))
        weightsChanged(slot);
    if (slot.field.attribute == attributes.inputGeometry || slot.field.attribute == attributes.input)
        makeOutputs(slot);
}

// what belongs to one geometry is known of the host's own attributes only
void GeometryFilterState::edited(Slot& slot) {
    const FilterAttributes& attributes = filterAttributes();
    const Slot* element = nullptr;
    for (const auto* own :
         {&attributes.input, &attributes.originalGeometry, &attributes.weightList, &attributes.outputGeom})
        if (isAtOrBelow(slot, **own))
            element = outermostElement(slot);
    const std::scoped_lock lock(mutex_);
    for (const auto& [index, geometry] : geometries_)
        if (geometry->onDevice && (!element || element->index == index))
            geometry->onDevice->isPrimed = false;
}

void GeometryFilterState::takeFromDevice() {
    std::vector<std::unique_ptr<DeviceGeometry>> left; // without the lock: a plug-in's code may ask for a geometry
    const std::scoped_lock lock(mutex_);
    for (const auto& [index, geometry] : geometries_)
        left.push_back(std::move(geometry->onDevice));
}

void GeometryFilterState::connectionsChanged() {
    const std::scoped_lock lock(mutex_);
    for (const auto& [index, geometry] : geometries_)
        geometry->weightsChanged();
}

void GeometryFilterState::weightsChanged(const Slot& slot) {
    const Slot* element = outermostElement(slot);
    const std::scoped_lock lock(mutex_);
    for (const auto& [index, geometry] : geometries_)
        if (!element || element->index == index)
            geometry->weightsChanged();
}

// an input that has a geometry has an output
void GeometryFilterState::makeOutputs(const Slot& slot) {
    const std::shared_ptr<Slot> outputs = data_.slot(*data_.node.type().find(*filterAttributes().outputGeom));
    const auto makeOutput = [&](unsigned index, const Slot& inputElement) {
        if (holdsGeometry(inputElement) && !outputs->elements().find(index))
            outputs->elementAt(index)->markClean(); // it becomes dirty with what follows, and so what depends on it
    };
    if (const Slot* element = outermostElement(slot))
        makeOutput(element->index, *element);
    else
        slot.elements().forEach([&](unsigned index, const std::shared_ptr<Slot>& part) { makeOutput(index, *part); });
}

std::shared_ptr<GeometryState> GeometryFilterState::geometry(unsigned index) {
    const std::scoped_lock lock(mutex_);
    std::shared_ptr<GeometryState>& state = geometries_[index];
    if (!state)
        state = std::make_shared<GeometryState>();
    return state;
}

void GeometryFilterState::forget(unsigned index) {
    std::shared_ptr<GeometryState> left; // see takeFromDevice()
    const std::scoped_lock lock(mutex_);
    const auto geometry = geometries_.find(index);
    if (geometry == geometries_.end())
        return;
    left = std::move(geometry->second);
    geometries_.erase(geometry);
}

std::unique_ptr<FilterState> makeGeometryFilterState(NodeData& data) {
    return std::make_unique<GeometryFilterState>(data);
}

GeometryFilterState& filterStateOf(const NodeData& data) {
    auto* state = dynamic_cast<GeometryFilterState*>(data.filterState.get());
    if (!state)
        throw std::invalid_argument("the data block is not that of a geometry filter");
    return *state;
}

std::shared_ptr<Slot> elementOf(const NodeData& data, const Attribute& array, unsigned index) {
    const Field* field = data.node.type().find(array);
    const std::shared_ptr<Slot> slot = field ? data.slot(*field) : nullptr;
    if (!slot)
        return nullptr;
    const ArrayReadLock lock(slot->owner);
    return slot->elements().find(index);
}

} // namespace OpenQuarn
