// SPDX-License-Identifier: Apache-2.0
// What a session does with a runtime that does not offer the function table it asks for: this program's own
// OrtGetApiBase stands before the library's.
#include <gmock/gmock.h>
#include <onnxruntime_c_api.h>

#include "nw_model/ModelSession.h"
#include "support.h"

using namespace neuralWarp;

const OrtApiBase* ORT_API_CALL OrtGetApiBase() noexcept {
    static const OrtApiBase base = {[](std::uint32_t) noexcept -> const OrtApi* { return nullptr; },
                                    []() noexcept { return "1.0.0"; }};
    return &base;
}

TEST(RuntimeTooOld, EveryOnnxLoadFailsWithItsLine) {
    ModelSession session;
    const std::filesystem::path model = testModel("direct");
    StdoutCapture out;
    EXPECT_EQ(session.load(model, true), LoadResult::Loaded);
    EXPECT_EQ(out.take(), "[NEURAL WARP] ERROR, Failed to load the ONNX model " + model.string() + "\n");
    EXPECT_EQ(session.errorText(), "ONNX Runtime is older than version 1.16");
    EXPECT_FALSE(session.isLoaded());
    EXPECT_EQ(session.inputCount(), 0);
    EXPECT_THAT(session.run(std::vector<float>(7)), testing::IsEmpty());
    EXPECT_EQ(session.load(testModel("missing"), true), LoadResult::NotFound);
}
