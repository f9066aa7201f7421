// SPDX-License-Identifier: Apache-2.0
#include "openquarn_app/Plugins.h"
#include "openquarn_app/Session.h"
#include "quarn/attributeTexts.h"
#include "quarn/commands.h"

#include <iostream>

namespace quarn {

void listAttributes(const std::vector<std::string>& plugins, const std::string& nodeType, bool json) {
    const OpenQuarn::Session session;
    for (const std::string& path : plugins)
        OpenQuarn::loadPlugin(path);
    const AttributeList list{OpenQuarn::attributesOf(nodeType), OpenQuarn::dependenciesOf(nodeType)};
    std::cout << (json ? attributeJson(list) + "\n" : attributeLines(list));
}

} // namespace quarn
