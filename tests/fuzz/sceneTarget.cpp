// SPDX-License-Identifier: Apache-2.0
#include "sceneTarget.h"

#include "host/files/fileNodes.h"

#include "openquarn_app/Messages.h"
#include "openquarn_app/SceneFile.h"
#include "openquarn_app/Session.h"

#include <cstdlib>
#include <string>

namespace {

void require(bool holds) {
    if (!holds)
        std::abort();
}

std::string written() {
    std::string text;
    require(OpenQuarn::sceneToText(text).ok);
    return text;
}

/// Drops what is shown while it lives.
class Silence {
public:
    Silence()
        : previous_(OpenQuarn::setMessageSink([](const OpenQuarn::Message&) {})) {}
    ~Silence() { OpenQuarn::setMessageSink(previous_); }
    Silence(const Silence&) = delete;
    Silence& operator=(const Silence&) = delete;

private:
    OpenQuarn::MessageSink previous_;
};

} // namespace

bool fuzzScene(const std::uint8_t* data, std::size_t size) {
    const Silence silence;
    const OpenQuarn::Session session;
    fileNodes::registerTypes();
    fileNodes::create("present");
    const std::string before = written();
    const std::string text(reinterpret_cast<const char*>(data), size);
    if (!OpenQuarn::sceneFromText(text, "fuzz").ok) {
        require(written() == before);
        return false;
    }
    const std::string once = written();
    require(OpenQuarn::sceneFromText(once, "fuzz").ok);
    require(written() == once);
    return true;
}
