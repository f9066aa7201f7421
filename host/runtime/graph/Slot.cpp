// SPDX-License-Identifier: Apache-2.0
#include "graph/Slot.h"

#include "graph/Node.h"
#include "graph/arrayLock.h"
#include "graph/told.h"

#include <algorithm>

namespace OpenQuarn {

// a scene may hold millions: with its counts it just fits a block of 112 bytes of the allocator
static_assert(sizeof(void*) != 8 || sizeof(Slot) <= 88);

Slot::Slot(const Field& slotField, NodeData* slotOwner, Slot* slotParent, bool element, unsigned logicalIndex)
    : field(slotField)
    , owner(slotOwner)
    , parent(slotParent)
    , index(logicalIndex)
    , isElement(element) {
    number = field.attribute->defaultNumber;
    data = field.attribute->defaultData;
    if (!isLeaf())
        parts_ = std::make_unique<Parts>();
    if (isCompound())
        makeChildren();
}

Slot::~Slot() {
    if (!parts_)
        return;
    const std::shared_ptr<const NodeClass> type = keptType();
    forEachPart([&](Slot& part) {
        part.unlink();
        part.cutOff(type);
    });
}

const Slot::Parts& Slot::noParts() {
    static const Parts none;
    return none;
}

void Slot::makeChildren() {
    parts_->children.reserve(field.children.size());
    for (const std::unique_ptr<Field>& childField : field.children)
        parts_->children.push_back(std::make_shared<Slot>(*childField, owner, this, false, 0U));
}

std::shared_ptr<Slot> Slot::elementAt(unsigned logicalIndex) {
    const auto existing = [&] {
        const ArrayReadLock lock(owner);
        return elements().find(logicalIndex);
    };
    if (std::shared_ptr<Slot> element = existing())
        return element;
    const ParallelGraphLock lock;
    if (std::shared_ptr<Slot> element = existing()) // another thread was faster
        return element;
    auto element = std::make_shared<Slot>(field, owner, this, true, logicalIndex);
    adopt(element);
    return element;
}

void Slot::adopt(const std::shared_ptr<Slot>& element) {
    element->parent = this;
    element->links.reset(); // it kept its type
    element->attach(owner);
    const bool isDue = field.computed || isDirty();
    if (isDue)
        element->markDirty();
    {
        const ArrayWriteLock lock(owner);
        ownElements().insert(element->index, element);
    }
    if (isDue) { // what depends on it, or will, has not been told
        element->forgetTold();
        forgetToldUpstream(*element);
    }
}

void Slot::removeElement(unsigned logicalIndex) {
    std::shared_ptr<Slot> element;
    {
        const ArrayWriteLock lock(owner);
        element = ownElements().remove(logicalIndex);
    }
    if (element)
        element->detach();
}

void Slot::attach(NodeData* newOwner) {
    owner = newOwner;
    forEachPart([newOwner](Slot& part) { part.attach(newOwner); });
}

std::shared_ptr<Slot> Slot::child(const Field& childField) const {
    return isCompound() && childField.parent == &field ? children()[childField.position] : nullptr;
}

void Slot::reset() {
    number = field.attribute->defaultNumber;
    data = field.attribute->defaultData;
    for (const std::shared_ptr<Slot>& part : children())
        part->reset();
    elements().forEach([](unsigned, const std::shared_ptr<Slot>& element) { element->detach(); });
    if (isArray())
        ownElements().clear();
}

void Slot::copyFrom(const Slot& from) {
    number = field.attribute->isNumber() ? field.attribute->stored(from.number) : from.number;
    data = from.data;
    for (std::size_t i = 0; i < children().size() && i < from.children().size(); ++i)
        children()[i]->copyFrom(*from.children()[i]);
    if (!isArray())
        return;
    const ParallelGraphLock lock;
    std::vector<unsigned> surplus;
    elements().forEach([&](unsigned elementIndex, const std::shared_ptr<Slot>&) {
        if (!from.elements().find(elementIndex))
            surplus.push_back(elementIndex);
    });
    for (const unsigned elementIndex : surplus)
        removeElement(elementIndex);
    from.elements().forEach([&](unsigned elementIndex, const std::shared_ptr<Slot>& element) {
        elementAt(elementIndex)->copyFrom(*element);
    });
}

namespace {

void forget(std::vector<Slot*>& slots, const Slot& slot) {
    slots.erase(std::remove(slots.begin(), slots.end(), &slot), slots.end());
}

} // namespace

void Slot::unlink() {
    if (links) {
        if (links->source)
            forget(links->source->links->destinations, *this);
        for (Slot* destination : links->destinations)
            destination->links->source = nullptr;
        links.reset();
    }
    forEachPart([](Slot& part) { part.unlink(); });
}

// made when it is needed: a control value must stay small (decision 0113)
Slot::Rare& Slot::rare() {
    if (!links)
        links = std::make_unique<Links>();
    if (!links->rare)
        links->rare = std::make_unique<Rare>();
    return *links->rare;
}

void Slot::keepTypeOf(const Slot& like) {
    rare().type = like.keptType();
}

std::shared_ptr<const NodeClass> Slot::keptType() const {
    for (const Slot* at = this; at; at = at->parent) {
        if (at->owner)
            return at->owner->node.typePointer();
        if (at->links && at->links->rare && at->links->rare->type)
            return at->links->rare->type;
    }
    return nullptr;
}

void Slot::detach() {
    const std::shared_ptr<const NodeClass> type = keptType();
    unlink();
    cutOff(type);
}

// a slot that nobody else holds has its type from the one above, for as long as there is one
void Slot::cutOff(const std::shared_ptr<const NodeClass>& type) {
    owner = nullptr;
    parent = nullptr;
    if (type && weak_from_this().use_count() > 1)
        rare().type = type;
    forEachPart([&](Slot& part) {
        part.cutOff(type);
        part.parent = this;
    });
}

std::string Slot::path() const {
    if (isElement)
        return (parent ? parent->path() : field.attribute->name) + "[" + std::to_string(index) + "]";
    return parent ? parent->path() + "." + field.attribute->name : field.attribute->name;
}

std::string Slot::name() const {
    return owner ? owner->node.name() + "." + path() : path();
}

void Slot::drop(std::uint8_t bits) {
    state_.fetch_and(static_cast<std::uint8_t>(~bits), std::memory_order_acq_rel);
}

void Slot::setFailed(bool failed) {
    if (failed)
        state_.fetch_or(failedBit, std::memory_order_acq_rel);
    else
        drop(failedBit);
}

void Slot::markBelow(std::uint8_t bits) {
    state_.fetch_or(bits, std::memory_order_acq_rel);
    forEachPart([bits](Slot& part) { part.markBelow(bits); });
}

void Slot::mark(std::uint8_t bits) {
    markBelow(bits);
    const std::uint8_t perhaps = bits & (belowBit | toldBelowBit);
    for (Slot* above = parent; above; above = above->parent)
        if ((above->state_.fetch_or(perhaps, std::memory_order_acq_rel) & perhaps) == perhaps)
            break;
}

void Slot::markDirty() {
    mark(dirtyBit | belowBit);
}

void Slot::markTold() {
    mark(dirtyBit | belowBit | toldBit | toldBelowBit);
}

void Slot::markClean() {
    const bool hadTold = mayHaveTold();
    markCleanBelow();
    // what is above is no longer dirty as a whole
    for (Slot* above = parent; above; above = above->parent)
        above->drop(dirtyBit | toldBit);
    if (hadTold)
        forgetToldUpstream(*this);
}

void Slot::markCleanBelow() {
    if (!mayBeDirty()) // clean already, and still failed if its last compute did
        return;
    forEachPart([](Slot& part) { part.markCleanBelow(); });
    state_.store(0, std::memory_order_release);
}

void Slot::forgetTold() {
    forgetToldBelow();
    for (Slot* above = parent; above; above = above->parent)
        above->drop(toldBit);
}

void Slot::forgetToldBelow() {
    if (!mayHaveTold())
        return;
    drop(toldBit | toldBelowBit);
    forEachPartKept(*this, [](Slot& part) { part.forgetToldBelow(); });
}

const Slot* outermostElement(const Slot& slot) {
    const Slot* element = nullptr;
    for (const Slot* at = &slot; at; at = at->parent)
        if (at->isElement)
            element = at;
    return element;
}

} // namespace OpenQuarn
