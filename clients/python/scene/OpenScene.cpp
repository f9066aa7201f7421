// SPDX-License-Identifier: Apache-2.0
#include "python/scene/OpenScene.h"

#include "openquarn_app/Evaluation.h"
#include "openquarn_app/SceneFile.h"
#include "quarn/scene/plugs.h"

#include <algorithm>
#include <stdexcept>
#include <utility>

namespace python {
namespace {

namespace fs = std::filesystem;

bool isModelRoot(const HPlug& plug) {
    return std::string(plug.partialName().asChar()) == "modelRoot" && quarn::nodeType(plug.node()) == "neuralWarp";
}

} // namespace

OpenScene::OpenScene(const fs::path& path)
    : path_(path.lexically_normal()) {
    const auto lock = Host::lock();
    Host::instance();
    scene_ = std::make_unique<OpenQuarn::Scene>();
    try {
        open();
    } catch (...) {
        scene_.reset();
        throw;
    }
    allOpen().push_back(this);
}

OpenScene::~OpenScene() {
    close();
}

void OpenScene::close() {
    if (isClosed())
        return;
    const auto lock = Host::lock();
    if (isClosed()) // by another thread, while this one waited
        return;
    deformers_.clear();
    scene_.reset();
    std::vector<OpenScene*>& open = allOpen();
    open.erase(std::find(open.begin(), open.end(), this));
}

std::vector<OpenScene*>& OpenScene::allOpen() {
    static auto& all = *new std::vector<OpenScene*>;
    return all;
}

void OpenScene::open() {
    const Visit visit(*this);
    OpenQuarn::FileOutcome outcome = OpenQuarn::openScene(path_);
    messages_.clear(); // the outcome has them
    if (!outcome)
        throw std::invalid_argument(outcome.error);
    warnings_ = std::move(outcome.warnings);
    placeModelRoots();
}

void OpenScene::placeModelRoots() {
    for (const HObject& node : quarn::nodesOfType("neuralWarp"))
        placeModelRoot(node);
}

void OpenScene::placeModelRoot(const HObject& deformer) const {
    HPlug root = quarn::plugOf(deformer, "modelRoot");
    if (root.isDestination())
        return;
    const bool isLocked = root.isLocked();
    root.setLocked(false);
    quarn::setText(root, textFor(root, quarn::textOf(root)));
    root.setLocked(isLocked);
}

std::string OpenScene::textFor(const HPlug& plug, const std::string& text) const {
    const bool isFolderOfModels = !text.empty() && isModelRoot(plug);
    return isFolderOfModels ? (path_.parent_path() / text).lexically_normal().string() : text;
}

std::vector<std::string> OpenScene::takeMessages() {
    const auto lock = Host::lock(); // an evaluation on another thread may add some
    return std::exchange(messages_, {});
}

OpenScene::Deformer& OpenScene::keptDeformer(const std::string& name) {
    std::unique_ptr<Deformer>& kept = deformers_[name];
    if (!kept) {
        auto found = std::make_unique<Deformer>();
        try {
            found->warp = quarn::Warp::find(name);
        } catch (const std::runtime_error& error) {
            throw std::invalid_argument(error.what());
        }
        kept = std::move(found);
    }
    return *kept;
}

const quarn::Warp& OpenScene::deformer(const std::string& name) {
    return keptDeformer(name).warp;
}

const std::vector<float>& OpenScene::controls(const std::string& deformer) {
    quarn::ControlReader& reader = keptDeformer(deformer).reader;
    reader.read();
    return reader.values();
}

Visit::Visit(OpenScene& scene)
    : lock_(Host::lock())
    , scene_(scene)
    , host_(Host::instance())
    , current_(scene.isClosed() ? throw std::runtime_error("the scene " + scene.path().string() + " is closed")
                                : *scene.scene_)
    , previousWarnings_(host_.setWarnings(&scene.messages_)) {
    host_.errors().clear();
}

Visit::~Visit() {
    if (std::string text = host_.errors().text(); !text.empty())
        scene_.messages_.push_back(std::move(text));
    host_.errors().clear();
    constexpr std::size_t kept = 1000;
    if (scene_.messages_.size() > kept)
        scene_.messages_.erase(scene_.messages_.begin(), scene_.messages_.end() - kept);
    host_.setWarnings(previousWarnings_);
}

void Visit::evaluate(const HPlug& plug) {
    HStatus status;
    evaluating(plug, [&] { status = OpenQuarn::evaluate(plug); });
    if (status.error())
        throw std::runtime_error(std::string(plug.name().asChar()) +
                                 " could not be evaluated: " + status.errorString().asChar());
}

void Visit::requireNoErrors(const HPlug& plug) {
    const std::string text = host_.errors().text();
    if (text.empty())
        return;
    host_.errors().clear();
    // else what was left there would be taken for its value next time, and a deformer that has looked for its model
    // would not look again
    OpenQuarn::makeDirty(plug);
    for (const HObject& node : quarn::nodesOfType("neuralWarp"))
        if (node == plug.node())
            scene_.placeModelRoot(node);
    throw std::runtime_error(std::string(plug.name().asChar()) + ": " + text);
}

} // namespace python
