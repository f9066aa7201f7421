// SPDX-License-Identifier: Apache-2.0
#include "graph/ArrayBuild.h"

#include "graph/arrayLock.h"

namespace OpenQuarn {
namespace {

std::shared_ptr<Slot> existing(const Slot& array, unsigned index) {
    const ArrayReadLock lock(array.owner);
    return array.elements().find(index);
}

} // namespace

std::shared_ptr<Slot> ArrayBuild::add(unsigned index) {
    if (std::shared_ptr<Slot> element = added.find(index))
        return element;
    if (!removed.find(index))
        if (std::shared_ptr<Slot> element = existing(*array, index))
            return element;
    auto element = std::make_shared<Slot>(array->field, nullptr, nullptr, true, index);
    element->keepTypeOf(*array);
    added.insert(index, element);
    return element;
}

bool ArrayBuild::remove(unsigned index) {
    if (added.remove(index))
        return true;
    const std::shared_ptr<Slot> element = removed.find(index) ? nullptr : existing(*array, index);
    if (element)
        removed.insert(index, element);
    return element != nullptr;
}

std::size_t ArrayBuild::size() const {
    const ArrayReadLock lock(array->owner);
    return array->elements().size() + added.size() - removed.size();
}

void commit(ArrayBuild& build) {
    const ParallelGraphLock lock;
    build.removed.forEach([&](unsigned index, const std::shared_ptr<Slot>&) { build.array->removeElement(index); });
    build.added.forEach([&](unsigned, const std::shared_ptr<Slot>& element) { build.array->adopt(element); });
    build.added.clear();
    build.removed.clear();
}

} // namespace OpenQuarn
