// SPDX-License-Identifier: Apache-2.0
#include "host/faults/FaultRows.h"

#include "openquarn/HExternalContentInfoTable.h"
#include "openquarn/HExternalContentLocationTable.h"
#include "openquarn/HStringResource.h"

namespace {

const HStringResourceId textId("servicesRows", "kText", "text");

HStatus getText() {
    HStatus status;
    HStringResource::getString(textId, status);
    return status;
}

HExternalContentInfoTable infoTable() {
    HExternalContentInfoTable table;
    table.addUnresolvedEntry("root", "models", "node1");
    return table;
}

HExternalContentLocationTable locationTable() {
    HExternalContentLocationTable table;
    table.addEntry("root", "models");
    return table;
}

template <class Table>
HStatus firstKey(const Table& table) {
    HStatus status;
    table.key(0, &status);
    return status;
}

HStatus getInfo() {
    HExternalContentInfo info;
    return infoTable().getInfo("root", info);
}

HStatus getLocation() {
    HString location;
    return locationTable().getLocation("root", location);
}

} // namespace

std::vector<FaultRow> servicesRows() {
    return {
        {"HStringResource::registerString", [] { return HStringResource::registerString(textId); }},
        {"HStringResource::getString", getText},
        {"HExternalContentInfoTable::addUnresolvedEntry",
         [] { return HExternalContentInfoTable().addUnresolvedEntry("root", "models", "node1"); }},
        {"HExternalContentInfoTable::addResolvedEntry",
         [] { return HExternalContentInfoTable().addResolvedEntry("root", "models", "/models", "node1"); }},
        {"HExternalContentInfoTable::key", [] { return firstKey(infoTable()); }},
        {"HExternalContentInfoTable::getInfo", getInfo},
        {"HExternalContentLocationTable::addEntry",
         [] { return HExternalContentLocationTable().addEntry("root", "models"); }},
        {"HExternalContentLocationTable::key", [] { return firstKey(locationTable()); }},
        {"HExternalContentLocationTable::getLocation", getLocation},
    };
}
