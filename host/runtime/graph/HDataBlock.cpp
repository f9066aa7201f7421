// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HDataBlock.h"

#include "core/apiCall.h"
#include "graph/ArrayBuild.h"
#include "graph/Context.h"
#include "graph/arrayLock.h"
#include "graph/evaluation.h"
#include "graph/plugImpl.h"
#include "graph/values.h"
#include "openquarn/HPlug.h"
#include "types/matrix.h"

using OpenQuarn::Access;
using OpenQuarn::apiCall;
using OpenQuarn::apiValue;
using OpenQuarn::isRefused;
using OpenQuarn::NodeData;
using OpenQuarn::Operation;
using OpenQuarn::Slot;

namespace {

using SlotPointer = std::shared_ptr<Slot>;

HStatus noData() {
    return {HStatus::kInvalidParameter, "the data block belongs to no node, or to one that has gone"};
}

/// The slot of an attribute in the block; null, with the status set, when it has none.
SlotPointer slotOf(const std::shared_ptr<NodeData>& data, const HObject& attribute, HStatus& status) {
    if (!data || data->isGone()) {
        status = noData();
        return nullptr;
    }
    const auto wanted = Access::as<OpenQuarn::Attribute>(attribute);
    const OpenQuarn::Field* field = wanted ? data->node.type().find(*wanted) : nullptr;
    SlotPointer slot = field ? data->slot(*field) : nullptr;
    if (!slot)
        status = {HStatus::kInvalidParameter, "node '" + data->node.name() + "' has no attribute '" +
                                                  (wanted ? wanted->name : std::string("(null)")) +
                                                  "' outside of its arrays"};
    return slot;
}

SlotPointer slotOf(const std::shared_ptr<NodeData>& data, const HPlug& plug, bool create, HStatus& status) {
    const HPlug::Impl* impl = OpenQuarn::plugImpl(plug);
    if (!data || data->isGone() || !impl || impl->node.get() != &data->node) {
        status = {HStatus::kInvalidParameter,
                  "the plug '" + plug.name().asStdString() + "' is not of the block's node"};
        return nullptr;
    }
    SlotPointer slot = resolvePlugIn(*data, plug, create);
    if (!slot)
        status = {HStatus::kFailure, "'" + plug.name().asStdString() + "' does not exist"};
    return slot;
}

HDataHandle handleOn(SlotPointer slot) {
    return slot ? Access::make<HDataHandle>(std::move(slot)) : HDataHandle();
}

// evaluates; a failing compute further up has been reported where it happened, and the last value is there
SlotPointer evaluated(SlotPointer slot) {
    if (slot)
        pull(slot);
    return slot;
}

void setSlotClean(Slot& slot) {
    const OpenQuarn::ParallelGraphLock lock; // another geometry of the node may be adding elements
    slot.markClean();
}

bool isOneValue(const SlotPointer& slot, HStatus& status) {
    if (!slot || !slot->isArray())
        return slot != nullptr;
    status = {HStatus::kInvalidParameter, "'" + slot->name() + "' is an array"};
    return false;
}

bool isArray(const SlotPointer& slot, HStatus& status) {
    if (!slot || slot->isArray())
        return slot != nullptr;
    status = {HStatus::kInvalidParameter, "'" + slot->name() + "' is not an array"};
    return false;
}

} // namespace

// --- HDataBlock ---

HDataBlock::HDataBlock() = default;
HDataBlock::HDataBlock(std::shared_ptr<NodeData> impl)
    : impl_(std::move(impl)) {}

HDataHandle HDataBlock::inputValue(const HObject& attribute, HStatus* status) {
    return apiValue(Operation::HDataBlock_inputValue, status, HDataHandle(), [&](HStatus& outcome) {
        SlotPointer slot = slotOf(impl_, attribute, outcome);
        return isOneValue(slot, outcome) ? handleOn(evaluated(std::move(slot))) : HDataHandle();
    });
}

HDataHandle HDataBlock::inputValue(const HPlug& plug, HStatus* status) {
    return apiValue(Operation::HDataBlock_inputValue, status, HDataHandle(), [&](HStatus& outcome) {
        SlotPointer slot = slotOf(impl_, plug, false, outcome);
        return isOneValue(slot, outcome) ? handleOn(evaluated(std::move(slot))) : HDataHandle();
    });
}

HArrayDataHandle HDataBlock::inputArrayValue(const HObject& attribute, HStatus* status) {
    return apiValue(Operation::HDataBlock_inputArrayValue, status, HArrayDataHandle(), [&](HStatus& outcome) {
        SlotPointer slot = slotOf(impl_, attribute, outcome);
        return isArray(slot, outcome) ? Access::make<HArrayDataHandle>(evaluated(std::move(slot))) : HArrayDataHandle();
    });
}

HDataHandle HDataBlock::outputValue(const HObject& attribute, HStatus* status) {
    return apiValue(Operation::HDataBlock_outputValue, status, HDataHandle(), [&](HStatus& outcome) {
        SlotPointer slot = slotOf(impl_, attribute, outcome);
        return isOneValue(slot, outcome) ? handleOn(std::move(slot)) : HDataHandle();
    });
}

HDataHandle HDataBlock::outputValue(const HPlug& plug, HStatus* status) {
    return apiValue(Operation::HDataBlock_outputValue, status, HDataHandle(), [&](HStatus& outcome) {
        SlotPointer slot = slotOf(impl_, plug, true, outcome);
        return isOneValue(slot, outcome) ? handleOn(std::move(slot)) : HDataHandle();
    });
}

HArrayDataHandle HDataBlock::outputArrayValue(const HObject& attribute, HStatus* status) {
    return apiValue(Operation::HDataBlock_outputArrayValue, status, HArrayDataHandle(), [&](HStatus& outcome) {
        SlotPointer slot = slotOf(impl_, attribute, outcome);
        return isArray(slot, outcome) ? Access::make<HArrayDataHandle>(std::move(slot)) : HArrayDataHandle();
    });
}

HStatus HDataBlock::setClean(const HPlug& plug) {
    return apiCall(Operation::HDataBlock_setClean, [&]() -> HStatus {
        HStatus status;
        if (const SlotPointer slot = slotOf(impl_, plug, false, status))
            setSlotClean(*slot);
        return status;
    });
}

HStatus HDataBlock::setClean(const HObject& attribute) {
    return apiCall(Operation::HDataBlock_setClean, [&]() -> HStatus {
        HStatus status;
        if (const SlotPointer slot = slotOf(impl_, attribute, status))
            setSlotClean(*slot);
        return status;
    });
}

bool HDataBlock::isClean(const HPlug& plug) const {
    if (isRefused(Operation::HDataBlock_isClean))
        return false;
    HStatus status;
    const SlotPointer slot = slotOf(impl_, plug, false, status);
    return slot && !slot->mayBeDirty();
}

HDGContext HDataBlock::context() const {
    return OpenQuarn::contextHandle(impl_ ? impl_->context : nullptr);
}

// --- HDataHandle ---

HDataHandle::HDataHandle() = default;
HDataHandle::HDataHandle(SlotPointer impl)
    : impl_(std::move(impl)) {}

bool HDataHandle::isValid() const {
    return impl_ != nullptr;
}

HFnData::Type HDataHandle::type() const {
    if (!impl_ || isRefused(Operation::HDataHandle_type))
        return HFnData::kInvalid;
    if (impl_->data)
        return impl_->data->dataType();
    return impl_->field.attribute->isNumber() ? HFnData::kNumeric : HFnData::kInvalid;
}

HFnNumericData::Type HDataHandle::numericType() const {
    return impl_ ? impl_->field.attribute->number : HFnNumericData::kInvalid;
}

HObject HDataHandle::attribute() const {
    return impl_ ? Access::object(std::const_pointer_cast<OpenQuarn::Attribute>(impl_->field.attribute)) : HObject();
}

namespace {

const Slot* toRead(const SlotPointer& slot, Operation operation) {
    return isRefused(operation) ? nullptr : slot.get();
}

} // namespace

bool HDataHandle::asBool() const {
    const Slot* slot = toRead(impl_, Operation::HDataHandle_asBool);
    return slot && numberIn(*slot) != 0.0;
}
short HDataHandle::asShort() const {
    const Slot* slot = toRead(impl_, Operation::HDataHandle_asShort);
    return slot ? shortIn(*slot) : short{0};
}
int HDataHandle::asInt() const {
    const Slot* slot = toRead(impl_, Operation::HDataHandle_asInt);
    return slot ? intIn(*slot) : 0;
}
float HDataHandle::asFloat() const {
    const Slot* slot = toRead(impl_, Operation::HDataHandle_asFloat);
    return slot ? static_cast<float>(numberIn(*slot)) : 0.0F;
}
double HDataHandle::asDouble() const {
    const Slot* slot = toRead(impl_, Operation::HDataHandle_asDouble);
    return slot ? numberIn(*slot) : 0.0;
}
HString HDataHandle::asString() const {
    const Slot* slot = toRead(impl_, Operation::HDataHandle_asString);
    return slot ? HString(textIn(*slot)) : HString();
}
HMatrix HDataHandle::asMatrix() const {
    const Slot* slot = toRead(impl_, Operation::HDataHandle_asMatrix);
    return slot ? OpenQuarn::toMatrix(matrixIn(*slot)) : HMatrix();
}

HObject HDataHandle::asMesh() const {
    const Slot* slot = toRead(impl_, Operation::HDataHandle_asMesh);
    return slot && slot->data && slot->data->dataType() == HFnData::kMesh ? Access::object(slot->data) : HObject();
}
HObject HDataHandle::data() const {
    const Slot* slot = toRead(impl_, Operation::HDataHandle_data);
    return slot && slot->data ? Access::object(slot->data) : HObject();
}

HPxData* HDataHandle::asPluginData() const {
    const Slot* slot = toRead(impl_, Operation::HDataHandle_asPluginData);
    const auto* data = slot ? dynamic_cast<const OpenQuarn::PluginData*>(slot->data.get()) : nullptr;
    return data ? data->value.get() : nullptr;
}

HDataHandle HDataHandle::child(const HObject& attribute) const {
    const bool isReadable = impl_ && !isRefused(Operation::HDataHandle_child);
    const auto wanted = isReadable ? Access::as<OpenQuarn::Attribute>(attribute) : nullptr;
    if (wanted)
        for (const SlotPointer& part : impl_->children())
            if (part->field.attribute == wanted)
                return HDataHandle(part);
    return {};
}

namespace {

HStatus noChild(const SlotPointer& slot, const HObject& attribute) {
    const auto wanted = Access::as<OpenQuarn::Attribute>(attribute);
    if (!slot)
        return {HStatus::kInvalidParameter, "the data handle is not valid"};
    return {HStatus::kInvalidParameter,
            "'" + slot->name() + "' has no child '" + (wanted ? wanted->name : std::string("(null)")) + "'"};
}

} // namespace

HArrayDataHandle HDataHandle::childArray(const HObject& attribute, HStatus* status) const {
    return apiValue(Operation::HDataHandle_childArray, status, HArrayDataHandle(), [&](HStatus& outcome) {
        SlotPointer slot = child(attribute).impl_;
        if (!slot)
            outcome = noChild(impl_, attribute);
        return isArray(slot, outcome) ? Access::make<HArrayDataHandle>(std::move(slot)) : HArrayDataHandle();
    });
}

namespace {

template <class Put>
HStatus write(const SlotPointer& slot, Put&& put) {
    return apiCall(Operation::HDataHandle_set, [&]() -> HStatus {
        if (!slot)
            return {HStatus::kInvalidParameter, "the data handle is not valid"};
        const std::string refused = put(*slot);
        return refused.empty() ? HStatus() : HStatus(HStatus::kFailure, refused);
    });
}

HStatus writeNumber(const SlotPointer& slot, double value) {
    return write(slot, [value](Slot& target) { return putNumber(target, value); });
}

} // namespace

HStatus HDataHandle::set(bool value) {
    return writeNumber(impl_, value ? 1.0 : 0.0);
}
HStatus HDataHandle::set(short value) {
    return writeNumber(impl_, value);
}
HStatus HDataHandle::set(int value) {
    return writeNumber(impl_, value);
}
HStatus HDataHandle::set(float value) {
    return writeNumber(impl_, static_cast<double>(value));
}
HStatus HDataHandle::set(double value) {
    return writeNumber(impl_, value);
}

HStatus HDataHandle::set(const HString& value) {
    return write(
        impl_, [&](Slot& slot) { return putData(slot, std::make_shared<OpenQuarn::StringData>(value.asStdString())); });
}

HStatus HDataHandle::set(const char* value) {
    return set(HString(value));
}

HStatus HDataHandle::set(const HMatrix& value) {
    return write(impl_, [&](Slot& slot) {
        return putData(slot, std::make_shared<OpenQuarn::MatrixData>(OpenQuarn::fromMatrix(value)));
    });
}

HStatus HDataHandle::set(const HObject& data) {
    return write(impl_, [&](Slot& slot) -> std::string {
        const auto value = Access::as<OpenQuarn::Data>(data);
        return value || data.isNull() ? putData(slot, value) : "the object is not a piece of data";
    });
}

HStatus HDataHandle::set(HPxData* data) {
    return write(impl_, [&](Slot& slot) -> std::string {
        const auto value = data ? OpenQuarn::ownerOf(*data) : nullptr;
        return value || !data ? putData(slot, value) : "the host did not create the plug-in data";
    });
}

HStatus HDataHandle::copy(const HDataHandle& source) {
    return apiCall(Operation::HDataHandle_copy, [&]() -> HStatus {
        if (!impl_ || !source.impl_)
            return {HStatus::kInvalidParameter, "the data handle is not valid"};
        if (impl_->isArray() != source.impl_->isArray() ||
            !impl_->field.attribute->takesValueOf(*source.impl_->field.attribute))
            return {HStatus::kFailure,
                    "'" + source.impl_->name() + "' is of another kind than '" + impl_->name() + "'"};
        impl_->copyFrom(*source.impl_);
        return HStatus::kSuccess;
    });
}

void HDataHandle::setClean() {
    if (impl_ && !isRefused(Operation::HDataHandle_setClean))
        setSlotClean(*impl_);
}

// --- HArrayDataHandle ---

namespace {

HStatus beyondLast(const SlotPointer& array) {
    if (!array)
        return {HStatus::kInvalidParameter, "the array handle is not valid"};
    return {HStatus::kFailure, "the handle on '" + array->name() + "' stands beyond its last element"};
}

SlotPointer firstFrom(const Slot& array, unsigned index) {
    const OpenQuarn::ArrayReadLock lock(array.owner);
    const auto* entry = array.elements().atOrAfter(index);
    return entry ? entry->item : nullptr;
}

} // namespace

HArrayDataHandle::HArrayDataHandle() = default;

HArrayDataHandle::HArrayDataHandle(SlotPointer impl)
    : impl_(std::move(impl))
    , current_(firstFrom(*impl_, 0)) {}

HArrayDataHandle::HArrayDataHandle(const HDataHandle& array, HStatus* status) {
    *this = apiValue(Operation::HArrayDataHandle_HArrayDataHandle, status, HArrayDataHandle(), [&](HStatus& outcome) {
        if (!array.impl_)
            outcome = {HStatus::kInvalidParameter, "the data handle is not valid"};
        return isArray(array.impl_, outcome) ? HArrayDataHandle(array.impl_) : HArrayDataHandle();
    });
}

bool HArrayDataHandle::isValid() const {
    return impl_ != nullptr;
}

unsigned HArrayDataHandle::elementCount() const {
    if (!impl_ || isRefused(Operation::HArrayDataHandle_elementCount))
        return 0;
    const OpenQuarn::ArrayReadLock lock(impl_->owner);
    return static_cast<unsigned>(impl_->elements().size());
}

unsigned HArrayDataHandle::elementIndex(HStatus* status) const {
    return apiValue(Operation::HArrayDataHandle_elementIndex, status, 0U, [&](HStatus& outcome) {
        if (current_)
            return current_->index;
        outcome = beyondLast(impl_);
        return 0U;
    });
}

HStatus HArrayDataHandle::next() {
    return apiCall(Operation::HArrayDataHandle_next, [&]() -> HStatus {
        if (!current_)
            return beyondLast(impl_);
        const unsigned index = current_->index;
        current_ = index == ~0U ? nullptr : firstFrom(*impl_, index + 1);
        return current_ ? HStatus() : beyondLast(impl_);
    });
}

namespace {

HStatus jump(const SlotPointer& array, SlotPointer& current, unsigned logicalIndex) {
    if (!array)
        return {HStatus::kInvalidParameter, "the array handle is not valid"};
    const OpenQuarn::ArrayReadLock lock(array->owner);
    SlotPointer element = array->elements().find(logicalIndex);
    if (!element)
        return {HStatus::kFailure, "'" + array->name() + "' has no element " + std::to_string(logicalIndex)};
    current = std::move(element);
    return HStatus::kSuccess;
}

} // namespace

HStatus HArrayDataHandle::jumpToElement(unsigned logicalIndex) {
    return apiCall(Operation::HArrayDataHandle_jumpToElement, [&] { return jump(impl_, current_, logicalIndex); });
}

HStatus HArrayDataHandle::jumpToArrayElement(unsigned logicalIndex) {
    return apiCall(Operation::HArrayDataHandle_jumpToArrayElement, [&] { return jump(impl_, current_, logicalIndex); });
}

HStatus HArrayDataHandle::jumpToPosition(unsigned position) {
    return apiCall(Operation::HArrayDataHandle_jumpToPosition, [&]() -> HStatus {
        if (!impl_)
            return {HStatus::kInvalidParameter, "the array handle is not valid"};
        const OpenQuarn::ArrayReadLock lock(impl_->owner);
        const auto* entry = impl_->elements().at(position);
        if (!entry)
            return {HStatus::kFailure,
                    "'" + impl_->name() + "' has no element at position " + std::to_string(position)};
        current_ = entry->item;
        return HStatus::kSuccess;
    });
}

HDataHandle HArrayDataHandle::inputValue(HStatus* status) {
    return apiValue(Operation::HArrayDataHandle_inputValue, status, HDataHandle(), [&](HStatus& outcome) {
        if (!current_)
            outcome = beyondLast(impl_);
        return handleOn(evaluated(current_));
    });
}

HDataHandle HArrayDataHandle::outputValue(HStatus* status) {
    return apiValue(Operation::HArrayDataHandle_outputValue, status, HDataHandle(), [&](HStatus& outcome) {
        if (!current_)
            outcome = beyondLast(impl_);
        return handleOn(current_);
    });
}

HArrayDataBuilder HArrayDataHandle::builder(HStatus* status) {
    return apiValue(Operation::HArrayDataHandle_builder, status, HArrayDataBuilder(), [&](HStatus& outcome) {
        if (!impl_) {
            outcome = {HStatus::kInvalidParameter, "the array handle is not valid"};
            return HArrayDataBuilder();
        }
        if (!impl_->field.attribute->builder) {
            outcome = {HStatus::kFailure, "'" + impl_->name() + "' does not use array data builders"};
            return HArrayDataBuilder();
        }
        const auto build = std::make_shared<OpenQuarn::ArrayBuild>();
        build->array = impl_;
        return Access::make<HArrayDataBuilder>(build);
    });
}

HStatus HArrayDataHandle::set(HArrayDataBuilder& builder) {
    return apiCall(Operation::HArrayDataHandle_set, [&]() -> HStatus {
        const auto& build = Access::impl(builder);
        if (!impl_ || !build || build->array != impl_)
            return {HStatus::kInvalidParameter, "the builder is not one of this array"};
        OpenQuarn::commit(*build);
        current_ = firstFrom(*impl_, 0);
        return HStatus::kSuccess;
    });
}

HStatus HArrayDataHandle::setAllClean() {
    return apiCall(Operation::HArrayDataHandle_setAllClean, [&]() -> HStatus {
        if (!impl_)
            return {HStatus::kInvalidParameter, "the array handle is not valid"};
        setSlotClean(*impl_);
        return HStatus::kSuccess;
    });
}

HStatus HArrayDataHandle::setClean() {
    return apiCall(Operation::HArrayDataHandle_setClean, [&]() -> HStatus {
        if (!current_)
            return beyondLast(impl_);
        setSlotClean(*current_);
        return HStatus::kSuccess;
    });
}

// --- HArrayDataBuilder ---

HArrayDataBuilder::HArrayDataBuilder() = default;
HArrayDataBuilder::HArrayDataBuilder(std::shared_ptr<OpenQuarn::ArrayBuild> impl)
    : impl_(std::move(impl)) {}

HDataHandle HArrayDataBuilder::addElement(unsigned logicalIndex, HStatus* status) {
    return apiValue(Operation::HArrayDataBuilder_addElement, status, HDataHandle(), [&](HStatus& outcome) {
        if (impl_)
            return handleOn(impl_->add(logicalIndex));
        outcome = {HStatus::kInvalidParameter, "the builder is not valid"};
        return HDataHandle();
    });
}

HStatus HArrayDataBuilder::removeElement(unsigned logicalIndex) {
    return apiCall(Operation::HArrayDataBuilder_removeElement, [&]() -> HStatus {
        if (!impl_)
            return {HStatus::kInvalidParameter, "the builder is not valid"};
        if (!impl_->remove(logicalIndex))
            return {HStatus::kFailure, "'" + impl_->array->name() + "' has no element " + std::to_string(logicalIndex)};
        return HStatus::kSuccess;
    });
}

unsigned HArrayDataBuilder::elementCount() const {
    return impl_ && !isRefused(Operation::HArrayDataBuilder_elementCount) ? static_cast<unsigned>(impl_->size()) : 0U;
}
