// SPDX-License-Identifier: Apache-2.0
// What the rows of the graph family work on: two nodes of a type with every kind of value, in a session of their own.
#pragma once

#include "host/faults/FaultRows.h"

#include "openquarn/HDataBlock.h"
#include "openquarn/HPlug.h"
#include "openquarn/HPxNode.h"
#include "openquarn_app/Session.h"

class HExternalContentInfoTable;
class HExternalContentLocationTable;

constexpr HTypeId rowNodeId{0x7101};
constexpr HTypeId rowDataId{0x7102};

class RowNode : public HPxNode {
public:
    HStatus addFile(HExternalContentInfoTable& table) const { return addExternalContentForFileAttr(table, text); }
    HStatus setFile(const HExternalContentLocationTable& table) { return setExternalContentForFileAttr(text, table); }

    static HObject number; ///< "number", a double from 1 to 9
    static HObject text;   ///< "text", a file name
    static HObject matrix; ///< "matrix"
    static HObject list;   ///< "list", an array of doubles with a builder
    static HObject group;  ///< "group", a compound of "items" (an array of doubles) and "part" (a double)
    static HObject items;
    static HObject part;
    static HObject out; ///< "out", a double; number affects it
};

/// `first` has "number" 2, "text" "words", a matrix that is not the identity, and the elements list[3], list[5] and
/// group.items[7]. Its "out" is connected to "number" of `second`.
struct GraphRig {
    GraphRig();
    HPlug plug(const HObject& attribute) const { return {first, attribute}; }
    HPlug element() const; ///< list[3]
    HDataBlock block() const { return user->forceCache(); }
    HDataHandle groupValue() const;
    HArrayDataHandle array() const; ///< list, standing on [3]

    OpenQuarn::Session session;
    HObject plugin; ///< that registered the types
    HObject first, second;
    RowNode* user = nullptr; ///< of `first`
    HObject textData;
};

/// A row whose call gets a rig that was made before. The second kind writes its status, and returns whether it
/// answered with a value: a failing one may not, and one that succeeds must.
FaultRow graphRow(const char* operation, HStatus (*call)(GraphRig& rig));
FaultRow graphRow(const char* operation, bool (*call)(GraphRig& rig, HStatus* status));

// parts of the family
std::vector<FaultRow> attributeRows();
std::vector<FaultRow> dataRows();
std::vector<FaultRow> nodeRows();
std::vector<FaultRow> plugRows();
