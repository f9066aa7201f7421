// SPDX-License-Identifier: Apache-2.0
// What the host holds after the catalogue has been registered.
#include "messages/catalogue.h"
#include "messages/messageText.h"

#include "openquarn/HStringResource.h"
#include "openquarn_app/Faults.h"

#include <gtest/gtest.h>

#include <iterator>
#include <string>

namespace {

using OpenQuarn::Faults;

struct Row {
    const char* key;
    const char* text;
};

// what translations and the users' own searches rely on: keys, texts and order stay as they are
constexpr Row registered[] = {
    {"kErrorMLModelInit", "[NEURAL WARP] No ML model initialized for index ^1s"},
    {"kErrorMLModelNoDeltas", "[NEURAL WARP] No delta computed from the ML model"},
    {"kErrorMlModelNotRecognized", "[NEURAL WARP] Could not recognize the specified ML model"},
    {"kErrorMLNodeJointMismatch", "[NEURAL WARP] Size mismatch between joint matrices and joint weights"},
    {"kErrorMlNoModelPath", "[NEURAL WARP] No model path specified"},
    {"kErrorMlNodeBadModelPath", "[NEURAL WARP] Unable to access the ML model file at ^1s"},
    {"kMlNodeControlCountMismatch",
     "[NEURAL WARP] Size of the ML model inputs (^1s) does not match the connected control attributes count(^2s)."},
    {"kMlNodeLimitCountMismatch", "[NEURAL WARP] Size of the ML model inputs (^1s) does not match the connected "
                                  "control limits attributes count(^2s)."},
    {"kMlNodeVertexCountMismatch",
     "[NEURAL WARP] Size of predicted deltas (^1s) does not match affected vertex count (^2s)"},
    {"kErrorInvalidMLNode", "[NEURAL WARP] ^1s is not a valid neural warp node"},
    {"kErrorMLDataInvalidIndex", "[NEURAL WARP] Could not get neural warp data for index ^1s"},
    {"kErrorMLNodeDeltaCalcFailed", "[NEURAL WARP] Failed to calculate deltas for index ^1s. Check your node setup."},
    {"kErrorMLModelPath", "[NEURAL WARP] Could not find the model directory ^1s"},
    {"kErrorMLModelInvalid", "[NEURAL WARP] The training of the ml model for index ^1s does not match the connected "
                             "geometry. It will need to be retrained."},
    {"kErrorMLMetaLoadFailed", "[NEURAL WARP \"^1s\"] Failed to load metadata from ^2s"},
    {"kErrorMLMetaFullCountMismatch", "[NEURAL WARP \"^1s\", multiIndex ^2s] Vertex count of the deformed geometry "
                                      "(^3s) does not match the vertex count of the trained model (^4s)"},
    {"kWarnMLMetaAffectCountMismatch", "[NEURAL WARP \"^1s\", multiIndex ^2s] Affected vertex count of the deformer "
                                       "(^3s) does not match the affected vertex count of the trained model (^4s)"},
    {"kWarnMLMetaSetup", "[NEURAL WARP \"^1s\", multiIndex ^2s] Setup for multiIndex ^2s not the same as for trained "
                         "model. Using deltas on ^3s of ^4s affected verts. Trained model subset is \"^5s\""},
    {"kEuler", "Euler"},
    {"kQuaternion", "Quaternion"},
    {"kDoubleAxis", "Double Axis"},
    {"kTripleAxis", "Triple Axis"},
    {"kModelOff", "Off"},
    {"kModelOn", "On"},
    {"kDeltaModeOffset", "Offset"},
    {"kDeltaModeSurface", "Surface"},
    {"kActivationSigmoid", "Sigmoid"},
    {"kActivationTanh", "Tanh"},
    {"kActivationReLU", "ReLU"},
    {"kActivationLeakyReLU", "LeakyReLU"},
    {"kActivationLinear", "Linear"},
};

constexpr Row raisedOnly[] = {
    {"kErrorMLOriginalGeomInvalid", "[NEURAL WARP] Original geometry is not a valid mesh"},
    {"kErrorMLInputGeomInvalid", "[NEURAL WARP] Input geometry is not a valid mesh"},
    {"kErrorMLNoTarget", "[NEURAL WARP] No target geometry has been specified"},
    {"kErrorMLTargetInvalid", "[NEURAL WARP] Target geometry is not a valid mesh"},
    {"kErrorMLTargetMismatch", "[NEURAL WARP] Size of target geometry (^1s) does not match deforming geometry (^2s)"},
    {"kErrorMLTargetBuffer", "[NEURAL WARP] Could not get buffer for target geometry"},
    {"kErrorMLDataInvalidDeltaType", "[NEURAL WARP] Invalid delta type \"^1s\" specified"},
};

constexpr int registeredCount = static_cast<int>(std::size(registered));

HString textOf(const char* key, const char* defaultText) {
    HStatus status;
    return HStringResource::getString({"neuralWarp", key, defaultText}, status);
}

void registerOtherTexts() {
    for (const Row& row : registered)
        ASSERT_FALSE(HStringResource::registerString({"neuralWarp", row.key, "other text"}).error());
}

TEST(Catalogue, CarriesTheTextsThatAreRaisedOnly) {
    ASSERT_EQ(neuralWarp::catalogue.size(), std::size(registered) + std::size(raisedOnly));
    neuralWarp::registerCatalogue();
    for (std::size_t i = 0; i < std::size(raisedOnly); ++i) {
        const auto text = static_cast<neuralWarp::Text>(registeredCount + i);
        EXPECT_STREQ(neuralWarp::entryOf(text).key, raisedOnly[i].key);
        EXPECT_EQ(neuralWarp::messageText(text), raisedOnly[i].text);
        EXPECT_EQ(textOf(raisedOnly[i].key, "default"), "default") << "is registered";
    }
}

TEST(Catalogue, RegistersInItsOrderAndGoesOnAfterARefusal) {
    for (int refused = 1; refused <= registeredCount + 1; ++refused) {
        registerOtherTexts();
        Faults::fail("HStringResource::registerString", refused);
        EXPECT_FALSE(neuralWarp::registerCatalogue().error());
        EXPECT_EQ(Faults::fired("HStringResource::registerString"), refused <= registeredCount);
        Faults::clear();
        for (int i = 0; i < registeredCount; ++i)
            EXPECT_EQ(textOf(registered[i].key, ""), i + 1 == refused ? "other text" : registered[i].text);
    }
}

} // namespace
