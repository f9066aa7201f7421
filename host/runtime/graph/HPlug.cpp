// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HPlug.h"

#include "core/apiCall.h"
#include "graph/Context.h"
#include "graph/Graph.h"
#include "graph/arrayLock.h"
#include "graph/evaluation.h"
#include "graph/plugImpl.h"
#include "graph/values.h"
#include "openquarn/HDataBlock.h"
#include "types/matrix.h"

#include <stdexcept>

using OpenQuarn::Access;
using OpenQuarn::apiCall;
using OpenQuarn::apiValue;
using OpenQuarn::Operation;
using OpenQuarn::Slot;

namespace {

HStatus nullPlug() {
    return {HStatus::kInvalidParameter, "the plug is null"};
}

HStatus failed(const HPlug& plug, const std::string& what) {
    if (plug.isNull())
        return nullPlug();
    return {HStatus::kFailure, "'" + plug.name().asStdString() + "' " + what};
}

bool namesWholeArray(const HPlug::Impl& impl) {
    return impl.field->isArray() && !impl.indices.back();
}

/// The plug's slot where the thread computes; null when there is none.
std::shared_ptr<Slot> existing(const HPlug& plug) {
    return resolvePlug(OpenQuarn::currentContext(), plug);
}

/// Evaluates the plug; null, with the status set, when there is no value to read.
std::shared_ptr<Slot> evaluated(const HPlug& plug, HStatus& status) {
    const HPlug::Impl* impl = OpenQuarn::plugImpl(plug);
    if (!impl) {
        status = nullPlug();
        return nullptr;
    }
    std::shared_ptr<Slot> slot = slotToEvaluate(OpenQuarn::currentContext(), plug);
    if (!slot)
        return nullptr;
    status = pull(slot);
    if (slot->owner)
        return slot;
    slot = existing(plug); // the evaluation has put another in its place, or removed it
    if (!slot)
        status = failed(plug, "does not exist after its node was evaluated");
    return slot;
}

/// The default value, for an element that does not exist.
const Slot& orDefault(const HPlug& plug, const std::shared_ptr<Slot>& slot, std::shared_ptr<Slot>& made) {
    if (slot)
        return *slot;
    made = std::make_shared<Slot>(*OpenQuarn::plugImpl(plug)->field, nullptr, nullptr,
                                  OpenQuarn::plugImpl(plug)->field->isArray(), 0U);
    return *made;
}

template <class Value, class Read>
Value readPlug(const HPlug& plug, Operation point, HStatus* status, Value fallback, Read&& read) {
    return apiValue(point, status, fallback, [&](HStatus& outcome) {
        std::shared_ptr<Slot> made;
        const std::shared_ptr<Slot> slot = evaluated(plug, outcome);
        if (!slot && outcome.error())
            return fallback;
        return read(orDefault(plug, slot, made));
    });
}

/// Why the plug cannot take the value, which `put` puts into a slot; empty when it can. Changes nothing.
template <class Put>
std::string setRefusal(const HPlug& plug, const HPlug::Impl& impl, Put&& put) {
    if (!impl.field->attribute->writable)
        return "'" + plug.name().asStdString() + "' is an output and cannot be set";
    if (const std::shared_ptr<Slot> nearest = nearestExisting(OpenQuarn::normalContext, plug))
        if (std::string refused = OpenQuarn::Graph::setRefusal(*nearest); !refused.empty())
            return refused;
    if (namesWholeArray(impl))
        return "'" + plug.name().asStdString() + "' is an array: set its elements";
    Slot probe(*impl.field, nullptr, nullptr, impl.field->isArray(), 0U);
    return put(probe);
}

/// Runs `put` on the plug's slot when it may be set, then announces the change.
template <class Put>
HStatus setPlug(const HPlug& plug, Operation point, Put&& put) {
    return apiCall(point, [&]() -> HStatus {
        const HPlug::Impl* impl = OpenQuarn::plugImpl(plug);
        if (!impl)
            return nullPlug();
        if (const std::string refused = setRefusal(plug, *impl, put); !refused.empty())
            return {HStatus::kFailure, refused};
        const bool isNew = !resolvePlug(OpenQuarn::normalContext, plug);
        const std::shared_ptr<Slot> slot = resolvePlug(OpenQuarn::normalContext, plug, true);
        if (!slot)
            return failed(plug, "does not name one value: an index is not chosen");
        put(*slot);
        OpenQuarn::Graph& graph = slot->owner->node.graph();
        if (isNew)
            graph.notify(*slot, HNodeMessage::kAttributeArrayAdded);
        graph.valueSet(*slot);
        return HStatus::kSuccess;
    });
}

HStatus setNumber(const HPlug& plug, Operation point, double value) {
    return setPlug(plug, point, [value](Slot& slot) { return putNumber(slot, slot.field.attribute->limited(value)); });
}

} // namespace

HPlug::HPlug() = default;
HPlug::HPlug(std::shared_ptr<const Impl> impl)
    : impl_(std::move(impl)) {}

HPlug::HPlug(const HObject& node, const HObject& attribute) {
    const auto found = Access::as<OpenQuarn::Node>(node);
    const auto wanted = Access::as<OpenQuarn::Attribute>(attribute);
    const OpenQuarn::Field* field = found && wanted ? found->type().find(*wanted) : nullptr;
    if (field)
        impl_ = std::make_shared<const Impl>(
            Impl{found, field, std::vector<std::optional<unsigned>>(OpenQuarn::arrayDepth(*field))});
}

bool HPlug::isNull() const {
    return !OpenQuarn::plugImpl(*this);
}

HObject HPlug::node() const {
    return isNull() ? HObject() : Access::object(impl_->node);
}

HObject HPlug::attribute() const {
    return isNull() ? HObject()
                    : Access::object(std::const_pointer_cast<OpenQuarn::Attribute>(impl_->field->attribute));
}

namespace {

std::string pathOf(const HPlug::Impl& impl, const OpenQuarn::Field& field, std::size_t& used) {
    std::string path = field.parent ? pathOf(impl, *field.parent, used) + "." : std::string();
    path += field.attribute->name;
    if (field.isArray()) {
        const std::optional<unsigned> index = impl.indices[used++];
        if (index)
            path += "[" + std::to_string(*index) + "]";
        else if (&field != impl.field)
            path += "[-1]";
    }
    return path;
}

} // namespace

HString HPlug::partialName() const {
    std::size_t used = 0;
    return isNull() ? HString() : HString(pathOf(*impl_, *impl_->field, used));
}

HString HPlug::name() const {
    return isNull() ? HString() : HString(impl_->node->name() + ".") + partialName();
}

bool HPlug::operator==(const HPlug& other) const {
    if (isNull() || other.isNull())
        return isNull() == other.isNull();
    return *impl_ == *other.impl_;
}

bool HPlug::operator==(const HObject& attribute) const {
    return !isNull() && this->attribute() == attribute;
}

bool HPlug::isArray() const {
    return !isNull() && namesWholeArray(*impl_);
}
bool HPlug::isElement() const {
    return !isNull() && impl_->field->isArray() && impl_->indices.back();
}
bool HPlug::isCompound() const {
    return !isNull() && impl_->field->isCompound() && !isArray();
}
bool HPlug::isChild() const {
    return !isNull() && impl_->field->parent && !isElement();
}

unsigned HPlug::logicalIndex(HStatus* status) const {
    return apiValue(Operation::HPlug_logicalIndex, status, 0U, [&](HStatus& outcome) {
        if (isElement())
            return *impl_->indices.back();
        outcome = failed(*this, "is not an element of an array");
        return 0U;
    });
}

unsigned HPlug::numElements(HStatus* status) const {
    return apiValue(Operation::HPlug_numElements, status, 0U, [&](HStatus& outcome) {
        if (!isArray()) {
            outcome = failed(*this, "is not an array");
            return 0U;
        }
        const std::shared_ptr<Slot> slot = existing(*this);
        return slot ? static_cast<unsigned>(slot->elements().size()) : 0U;
    });
}

HStatus HPlug::getExistingArrayAttributeIndices(std::vector<unsigned>& indices) const {
    return apiCall(Operation::HPlug_getExistingArrayAttributeIndices, [&]() -> HStatus {
        if (!isArray())
            return failed(*this, "is not an array");
        indices.clear();
        const std::shared_ptr<Slot> slot = existing(*this);
        if (!slot)
            return HStatus::kSuccess;
        indices.reserve(slot->elements().size());
        slot->elements().forEach([&](unsigned index, const std::shared_ptr<Slot>&) { indices.push_back(index); });
        return HStatus::kSuccess;
    });
}

namespace {

HPlug elementOf(const HPlug::Impl& array, unsigned index) {
    HPlug::Impl impl = array;
    impl.indices.back() = index;
    return OpenQuarn::plugOf(std::move(impl));
}

} // namespace

HPlug HPlug::elementByLogicalIndex(unsigned index, HStatus* status) const {
    return apiValue(Operation::HPlug_elementByLogicalIndex, status, HPlug(), [&](HStatus& outcome) {
        if (isArray())
            return elementOf(*impl_, index);
        outcome = failed(*this, "is not an array");
        return HPlug();
    });
}

HPlug HPlug::elementByPhysicalIndex(unsigned position, HStatus* status) const {
    return apiValue(Operation::HPlug_elementByPhysicalIndex, status, HPlug(), [&](HStatus& outcome) {
        const std::shared_ptr<Slot> slot = isArray() ? existing(*this) : nullptr;
        const auto* entry = slot ? slot->elements().at(position) : nullptr;
        if (entry)
            return elementOf(*impl_, entry->index);
        outcome = failed(*this, "has no element at position " + std::to_string(position));
        return HPlug();
    });
}

HPlug HPlug::array(HStatus* status) const {
    return apiValue(Operation::HPlug_array, status, HPlug(), [&](HStatus& outcome) {
        if (!isElement()) {
            outcome = failed(*this, "is not an element of an array");
            return HPlug();
        }
        Impl impl = *impl_;
        impl.indices.back().reset();
        return OpenQuarn::plugOf(std::move(impl));
    });
}

unsigned HPlug::numChildren(HStatus* status) const {
    return apiValue(Operation::HPlug_numChildren, status, 0U, [&](HStatus& outcome) {
        if (!isNull() && impl_->field->isCompound())
            return static_cast<unsigned>(impl_->field->children.size());
        outcome = failed(*this, "is not a compound");
        return 0U;
    });
}

namespace {

HPlug childOf(const HPlug::Impl& parent, const OpenQuarn::Field& field) {
    HPlug::Impl impl = parent;
    impl.field = &field;
    if (field.isArray())
        impl.indices.emplace_back();
    return OpenQuarn::plugOf(std::move(impl));
}

} // namespace

HPlug HPlug::child(unsigned number, HStatus* status) const {
    return apiValue(Operation::HPlug_child, status, HPlug(), [&](HStatus& outcome) {
        if (!isNull() && number < impl_->field->children.size())
            return childOf(*impl_, *impl_->field->children[number]);
        outcome = failed(*this, "has no child number " + std::to_string(number));
        return HPlug();
    });
}

HPlug HPlug::child(const HObject& attribute, HStatus* status) const {
    return apiValue(Operation::HPlug_child, status, HPlug(), [&](HStatus& outcome) {
        const auto wanted = Access::as<OpenQuarn::Attribute>(attribute);
        const OpenQuarn::Field* field = !isNull() && wanted ? impl_->node->type().find(*wanted) : nullptr;
        if (field && field->parent == impl_->field)
            return childOf(*impl_, *field);
        outcome = failed(*this, "has no child '" + (wanted ? wanted->name : std::string()) + "'");
        return HPlug();
    });
}

HPlug HPlug::parent(HStatus* status) const {
    return apiValue(Operation::HPlug_parent, status, HPlug(), [&](HStatus& outcome) {
        if (!isChild()) {
            outcome = failed(*this, "is not a child of a compound");
            return HPlug();
        }
        Impl impl = *impl_;
        if (impl.field->isArray())
            impl.indices.pop_back();
        impl.field = impl.field->parent;
        return OpenQuarn::plugOf(std::move(impl));
    });
}

HStatus HPlug::selectAncestorLogicalIndex(unsigned index, const HObject& ancestor) {
    return apiCall(Operation::HPlug_selectAncestorLogicalIndex, [&]() -> HStatus {
        if (isNull())
            return nullPlug();
        const auto wanted = Access::as<OpenQuarn::Attribute>(ancestor);
        std::size_t place = impl_->indices.size();
        for (const OpenQuarn::Field* field = impl_->field; field; field = field->parent) {
            if (!field->isArray())
                continue;
            --place;
            if (!wanted || field->attribute == wanted) {
                Impl impl = *impl_;
                impl.indices[place] = index;
                *this = OpenQuarn::plugOf(std::move(impl));
                return HStatus::kSuccess;
            }
        }
        return failed(*this, "has no such array at or above it");
    });
}

bool HPlug::isDestination() const {
    const std::shared_ptr<Slot> slot = existing(*this);
    return slot && sourceInContext(*slot);
}

bool HPlug::isSource() const {
    const std::shared_ptr<Slot> slot = existing(*this);
    return slot && slot->hasDestinations();
}

bool HPlug::isConnected() const {
    return isDestination() || isSource();
}

namespace {

// the part of `source` that lies below it as `part` lies below `whole`
std::shared_ptr<Slot> partBelow(const std::shared_ptr<Slot>& source, const Slot& whole, const Slot& part) {
    if (&part == &whole)
        return source;
    const std::shared_ptr<Slot> parent = partBelow(source, whole, *part.parent);
    if (!parent)
        return nullptr;
    if (part.isElement)
        return parent->elements().find(part.index);
    const std::size_t position = part.field.position;
    return position < parent->children().size() ? parent->children()[position] : nullptr;
}

} // namespace

HPlug HPlug::source(HStatus* status) const {
    return apiValue(Operation::HPlug_source, status, HPlug(), [&](HStatus& outcome) {
        if (isNull()) {
            outcome = nullPlug();
            return HPlug();
        }
        const std::shared_ptr<Slot> slot = existing(*this);
        for (const Slot* at = slot.get(); at; at = at->parent)
            if (const std::shared_ptr<Slot> source = sourceInContext(*at)) {
                const std::shared_ptr<Slot> part = partBelow(source, *at, *slot);
                return part ? OpenQuarn::makePlug(*part) : HPlug();
            }
        return HPlug();
    });
}

HStatus HPlug::destinations(HPlugArray& plugs) const {
    return apiCall(Operation::HPlug_destinations, [&]() -> HStatus {
        if (isNull())
            return nullPlug();
        plugs.clear();
        const std::shared_ptr<Slot> slot = existing(*this);
        if (!slot || !slot->links)
            return HStatus::kSuccess;
        plugs.reserve(slot->links->destinations.size());
        for (const Slot* destination : slot->links->destinations)
            plugs.push_back(OpenQuarn::makePlug(*destination));
        return HStatus::kSuccess;
    });
}

bool HPlug::isLocked() const {
    const std::shared_ptr<Slot> slot = existing(*this);
    return slot && slot->locked;
}

HStatus HPlug::setLocked(bool on) {
    return apiCall(Operation::HPlug_setLocked, [&]() -> HStatus {
        const std::shared_ptr<Slot> slot = resolvePlug(OpenQuarn::normalContext, *this, true);
        if (!slot)
            return isNull() ? nullPlug() : failed(*this, "does not name one value: an index is not chosen");
        slot->owner->node.graph().setLocked(*slot, on);
        return HStatus::kSuccess;
    });
}

bool HPlug::asBool(HStatus* status) const {
    return readPlug(*this, Operation::HPlug_asBool, status, false,
                    [](const Slot& slot) { return numberIn(slot) != 0.0; });
}
short HPlug::asShort(HStatus* status) const {
    return readPlug(*this, Operation::HPlug_asShort, status, short{0}, [](const Slot& slot) { return shortIn(slot); });
}
int HPlug::asInt(HStatus* status) const {
    return readPlug(*this, Operation::HPlug_asInt, status, 0, [](const Slot& slot) { return intIn(slot); });
}
float HPlug::asFloat(HStatus* status) const {
    return readPlug(*this, Operation::HPlug_asFloat, status, 0.0F,
                    [](const Slot& slot) { return static_cast<float>(numberIn(slot)); });
}
double HPlug::asDouble(HStatus* status) const {
    return readPlug(*this, Operation::HPlug_asDouble, status, 0.0, [](const Slot& slot) { return numberIn(slot); });
}
HString HPlug::asString(HStatus* status) const {
    return readPlug(*this, Operation::HPlug_asString, status, HString(),
                    [](const Slot& slot) { return HString(textIn(slot)); });
}
HMatrix HPlug::asMatrix(HStatus* status) const {
    return readPlug(*this, Operation::HPlug_asMatrix, status, HMatrix(),
                    [](const Slot& slot) { return OpenQuarn::toMatrix(matrixIn(slot)); });
}
HObject HPlug::asHObject(HStatus* status) const {
    return readPlug(*this, Operation::HPlug_asHObject, status, HObject(),
                    [](const Slot& slot) { return Access::object(slot.data); });
}

HStatus HPlug::setBool(bool value) {
    return setNumber(*this, Operation::HPlug_setBool, value ? 1.0 : 0.0);
}
HStatus HPlug::setShort(short value) {
    return setNumber(*this, Operation::HPlug_setShort, value);
}
HStatus HPlug::setInt(int value) {
    return setNumber(*this, Operation::HPlug_setInt, value);
}
HStatus HPlug::setFloat(float value) {
    return setNumber(*this, Operation::HPlug_setFloat, static_cast<double>(value));
}
HStatus HPlug::setDouble(double value) {
    return setNumber(*this, Operation::HPlug_setDouble, value);
}

HStatus HPlug::setString(const HString& value) {
    return setPlug(*this, Operation::HPlug_setString, [&](Slot& slot) {
        return putData(slot, std::make_shared<OpenQuarn::StringData>(value.asStdString()));
    });
}

HStatus HPlug::setMatrix(const HMatrix& value) {
    return setPlug(*this, Operation::HPlug_setMatrix, [&](Slot& slot) {
        return putData(slot, std::make_shared<OpenQuarn::MatrixData>(OpenQuarn::fromMatrix(value)));
    });
}

HStatus HPlug::setHObject(const HObject& data) {
    return setPlug(*this, Operation::HPlug_setHObject, [&](Slot& slot) -> std::string {
        const auto value = Access::as<OpenQuarn::Data>(data);
        if (!value && !data.isNull())
            return "the object is not a piece of data";
        return putData(slot, value);
    });
}

HDataHandle HPlug::asHDataHandle(HStatus* status) const {
    return apiValue(Operation::HPlug_asHDataHandle, status, HDataHandle(), [&](HStatus& outcome) {
        std::shared_ptr<Slot> slot = evaluated(*this, outcome);
        if (!slot && !outcome.error())
            outcome = failed(*this, "does not exist");
        return slot ? Access::make<HDataHandle>(std::move(slot)) : HDataHandle();
    });
}

HStatus HPlug::destructHandle(HDataHandle& handle) const {
    return apiCall(Operation::HPlug_destructHandle, [&]() -> HStatus {
        if (!handle.isValid())
            return {HStatus::kInvalidParameter, "the data handle is not valid"};
        handle = HDataHandle();
        return HStatus::kSuccess;
    });
}
