// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>

/// What is inserted into a scene of a time node and a "fileNode" named "one".
struct SceneParts {
    std::string values = {};      ///< of "one", without braces
    std::string nodeKeys = {};    ///< of "one", each with a comma before it
    std::string connections = {}; ///< without brackets
    std::string sceneKeys = {};   ///< each with a comma before it
};

inline std::string sceneText(const SceneParts& parts) {
    return R"({"openquarnScene":1,"time":1,"nodes":[{"name":"time1","type":"time"},{"name":"one","type":"fileNode",)"
           R"("values":{)" +
           parts.values + "}" + parts.nodeKeys + "}],\"connections\":[" + parts.connections + "]" + parts.sceneKeys +
           "}";
}
