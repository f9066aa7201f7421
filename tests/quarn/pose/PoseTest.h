// SPDX-License-Identifier: Apache-2.0
// A test with the strip in a folder of its own.
#pragma once

#include "stripScene.h"

#include "quarn/scene/SceneSession.h"
#include "quarn/scene/plugs.h"
#include "support/TemporaryFolder.h"
#include "support/failureOf.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fstream>
#include <iterator>
#include <memory>

class PoseTest : public ::testing::Test {
protected:
    std::string path(const std::string& name) const { return (folder_.path() / name).string(); }
    std::string scene() const { return path("scene.json"); }
    static std::string bytes(const std::string& file) {
        std::ifstream stream(file, std::ios::binary);
        return {std::istreambuf_iterator<char>(stream), {}};
    }
    std::string write(const std::string& name, const std::string& text) const {
        std::ofstream(path(name), std::ios::binary) << text;
        return path(name);
    }
    /// quarn pose of the strip into posed.json.
    std::string pose(std::vector<std::string> arguments) const {
        arguments.insert(arguments.begin(), {"pose", scene(), "-o", path("posed.json")});
        return stripScene::quarn(arguments);
    }
    std::string poseFailure(const std::vector<std::string>& arguments) const {
        return failureOf([&] { pose(arguments); });
    }
    std::unique_ptr<quarn::SceneSession> open(const std::string& name = "posed.json") const {
        auto session = std::make_unique<quarn::SceneSession>();
        session->open(path(name));
        return session;
    }
    static double at(quarn::SceneSession& session, double frame, const std::string& plug) {
        session.host().setTime(frame);
        return quarn::numberOf(quarn::findPlug(plug));
    }

private:
    TemporaryFolder folder_;
};
