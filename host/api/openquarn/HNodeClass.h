// SPDX-License-Identifier: Apache-2.0
// Node types by name.
#pragma once

#include "openquarn/HObject.h"
#include "openquarn/HStatus.h"
#include "openquarn/HString.h"
#include "openquarn/HTypeId.h"

#include <memory>

/// A registered node type. Null when there is none of the name, and after it was deregistered. [any] throughout.
class OPENQUARN_API HNodeClass {
public:
    explicit HNodeClass(const HString& typeName);
    bool isNull() const;
    HString typeName() const;
    HTypeId typeId() const;
    /// The attribute with that long or short name, at any depth; null, and a failure, when there is none.
    HObject attribute(const HString& name, HStatus* status = nullptr) const;

private:
    std::weak_ptr<const OpenQuarn::NodeClass> impl_;
};
