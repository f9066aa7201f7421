// SPDX-License-Identifier: Apache-2.0
// Base class of the data types that a plug-in registers.
#pragma once

#include "openquarn/HStatus.h"
#include "openquarn/HString.h"
#include "openquarn/HTypeId.h"

#include <iosfwd>

/// The host creates objects of a registered data type through its creator, owns them and destroys them. An object is
/// shared by the plugs that it reached along connections: whoever may change it while others read it is the plug-in's
/// own affair.
class OPENQUARN_API HPxData {
public:
    /// Kinds of plug-in data.
    enum Type : int { kData = 0 };

    HPxData() = default;
    HPxData(const HPxData&) = delete;
    HPxData& operator=(const HPxData&) = delete;
    virtual ~HPxData();

    /// Reads or writes the value in a scene file, as text or as bytes; called for storable attributes. The default
    /// answers kNotImplemented: the data is not stored, and comes back empty. [main]
    virtual HStatus readASCII(const HString& text);
    virtual HStatus readBinary(std::istream& stream, unsigned length);
    virtual HStatus writeASCII(std::ostream& stream);
    virtual HStatus writeBinary(std::ostream& stream);

    /// Makes this a copy of `source`, which may be of another data type: then do nothing. Called when a node is
    /// duplicated. [main]
    virtual void copy(const HPxData& source) = 0;
    /// The id and the name it was registered with. [any]
    virtual HTypeId typeId() const = 0;
    virtual HString name() const = 0;
};
