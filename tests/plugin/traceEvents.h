// SPDX-License-Identifier: Apache-2.0
// What a recording shows, as its file tells it. Needs RapidJSON.
#pragma once

#include "openquarn_app/Profiling.h"
#include "support/TemporaryFolder.h"

#include <rapidjson/document.h>
#include <rapidjson/istreamwrapper.h>

#include <fstream>
#include <string>
#include <vector>

struct TraceEvent {
    std::string label; ///< "category name colour"
    double begin, end;
};

/// The scopes of that description while `body` ran, in the order in which they ended.
template <class Body>
std::vector<TraceEvent> recordedEvents(const std::string& description, Body&& body) {
    OpenQuarn::Profiling::start();
    body();
    OpenQuarn::Profiling::stop();
    const TemporaryFolder folder;
    OpenQuarn::Profiling::writeTrace(folder.path() / "trace.json");
    std::ifstream file(folder.path() / "trace.json");
    rapidjson::IStreamWrapper stream(file);
    rapidjson::Document trace;
    trace.ParseStream(stream);
    std::vector<TraceEvent> events;
    for (const auto& event : trace["traceEvents"].GetArray()) {
        if (event["ph"] != "X" || event["args"]["description"].GetString() != description)
            continue;
        const double begin = event["ts"].GetDouble();
        events.push_back({std::string(event["cat"].GetString()) + ' ' + event["name"].GetString() + ' ' +
                              std::to_string(event["args"]["color"].GetInt()),
                          begin, begin + event["dur"].GetDouble()});
    }
    return events;
}
