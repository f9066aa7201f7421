// SPDX-License-Identifier: Apache-2.0
// How a session uses the runtime, and what it does when a call fails: this program's own OrtGetApiBase stands before
// the library's and hands out a table that counts, and fails on demand. The table ends with version 16: a newer
// function would be a null pointer.
#include <cstddef>
#include <cstring>
#include <functional>
#include <vector>

#include <dlfcn.h>
#include <gmock/gmock.h>
#include <onnxruntime_c_api.h>

#include "nw_model/ModelSession.h"
#include "support.h"

using namespace neuralWarp;
using testing::IsEmpty;

namespace {

const OrtApi* realApi = nullptr;
std::vector<std::uint32_t> askedVersions;

/// One entry of the table that returns a status.
template <auto Entry>
struct Hook;

template <typename... Args, OrtStatusPtr (*OrtApi::*Entry)(Args...) noexcept>
struct Hook<Entry> {
    static inline int calls = 0;
    static inline int failures = 0; // how many of the next calls fail

    static OrtStatusPtr call(Args... args) noexcept {
        ++calls;
        if (failures > 0) {
            --failures;
            return realApi->CreateStatus(ORT_FAIL, "armed");
        }
        return (realApi->*Entry)(args...);
    }
};

/// One entry of the table that releases an object.
template <auto Entry>
struct Release;

template <typename T, void (*OrtApi::*Entry)(T*)>
struct Release<Entry> {
    static inline int calls = 0;

    static void call(T* object) {
        calls += object == nullptr ? 0 : 1;
        (realApi->*Entry)(object);
    }
};

template <auto... Entries>
void hook(OrtApi& api) {
    ((api.*Entries = &Hook<Entries>::call), ...);
}

template <auto... Entries>
void hookReleases(OrtApi& api) {
    ((api.*Entries = &Release<Entries>::call), ...);
}

OrtApi makeTable() {
    void* library = dlopen("libonnxruntime.so.1", RTLD_NOW);
    const auto base = reinterpret_cast<const OrtApiBase* (*)()>(dlsym(library, "OrtGetApiBase"));
    realApi = base()->GetApi(16);
    OrtApi api;
    std::memset(&api, 0, sizeof api);
    std::memcpy(&api, realApi, offsetof(OrtApi, SetUserLoggingFunction)); // the first function of version 17
    hook<&OrtApi::GetAllocatorWithDefaultOptions, &OrtApi::CreateEnv, &OrtApi::SetLanguageProjection,
         &OrtApi::CreateSessionOptions, &OrtApi::SetSessionGraphOptimizationLevel, &OrtApi::CreateSession,
         &OrtApi::SessionGetInputCount, &OrtApi::SessionGetOutputCount, &OrtApi::SessionGetInputName,
         &OrtApi::SessionGetOutputName, &OrtApi::SessionGetInputTypeInfo, &OrtApi::SessionGetOutputTypeInfo,
         &OrtApi::CastTypeInfoToTensorInfo, &OrtApi::GetDimensionsCount, &OrtApi::GetDimensions,
         &OrtApi::CreateCpuMemoryInfo, &OrtApi::CreateTensorWithDataAsOrtValue, &OrtApi::Run>(api);
    hookReleases<&OrtApi::ReleaseEnv, &OrtApi::ReleaseSession, &OrtApi::ReleaseSessionOptions, &OrtApi::ReleaseTypeInfo,
                 &OrtApi::ReleaseMemoryInfo, &OrtApi::ReleaseValue>(api);
    return api;
}

const OrtApi* getApi(std::uint32_t version) noexcept {
    askedVersions.push_back(version);
    static const OrtApi api = makeTable();
    return &api;
}

/// Objects made and not yet released, of every kind.
int liveObjects() {
    return Hook<&OrtApi::CreateEnv>::calls - Release<&OrtApi::ReleaseEnv>::calls + Hook<&OrtApi::CreateSession>::calls -
           Release<&OrtApi::ReleaseSession>::calls + Hook<&OrtApi::CreateSessionOptions>::calls -
           Release<&OrtApi::ReleaseSessionOptions>::calls + Hook<&OrtApi::SessionGetInputTypeInfo>::calls +
           Hook<&OrtApi::SessionGetOutputTypeInfo>::calls - Release<&OrtApi::ReleaseTypeInfo>::calls +
           Hook<&OrtApi::CreateCpuMemoryInfo>::calls - Release<&OrtApi::ReleaseMemoryInfo>::calls +
           Hook<&OrtApi::CreateTensorWithDataAsOrtValue>::calls - Release<&OrtApi::ReleaseValue>::calls;
}

/// Makes the next call of one entry fail. The entry counts as not called then: it made no object.
template <auto Entry>
void arm() {
    Hook<Entry>::failures = 1;
    --Hook<Entry>::calls;
}

} // namespace

const OrtApiBase* ORT_API_CALL OrtGetApiBase() noexcept {
    static const OrtApiBase base = {&getApi, []() noexcept { return "1.16.0"; }};
    return &base;
}

TEST(RuntimeFaults, TableOfVersion16IsAskedForOnce) {
    ModelSession first;
    ModelSession second;
    EXPECT_THAT(askedVersions, testing::ElementsAre(16u));
}

TEST(RuntimeFaults, AllocatorFailureLeavesTheConstructor) {
    Hook<& OrtApi::GetAllocatorWithDefaultOptions>::failures = 1;
    EXPECT_THROW(ModelSession(), std::exception);
    EXPECT_NO_THROW(ModelSession());
}

TEST(RuntimeFaults, EveryStepOfALoadCanFail) {
    const std::vector<std::function<void()>> steps = {
        arm<&OrtApi::CreateEnv>,
        arm<&OrtApi::SetLanguageProjection>,
        arm<&OrtApi::CreateSessionOptions>,
        arm<&OrtApi::SetSessionGraphOptimizationLevel>,
        arm<&OrtApi::CreateSession>,
        arm<&OrtApi::SessionGetInputCount>,
        arm<&OrtApi::SessionGetInputName>,
        arm<&OrtApi::SessionGetInputTypeInfo>,
        arm<&OrtApi::CastTypeInfoToTensorInfo>,
        arm<&OrtApi::GetDimensionsCount>,
        arm<&OrtApi::GetDimensions>,
        arm<&OrtApi::SessionGetOutputCount>,
        arm<&OrtApi::SessionGetOutputName>,
        arm<&OrtApi::SessionGetOutputTypeInfo>,
    };
    const int before = liveObjects();
    for (std::size_t step = 0; step < steps.size(); ++step) {
        ModelSession session;
        session.load(testModel("direct"), true);
        steps[step]();
        StdoutCapture out;
        EXPECT_EQ(session.load(testModel("direct"), true), LoadResult::Loaded) << step;
        EXPECT_EQ(out.take(),
                  "[NEURAL WARP] ERROR, Failed to load the ONNX model " + testModel("direct").string() + "\n");
        EXPECT_EQ(session.errorText(), "armed") << step;
        EXPECT_FALSE(session.isLoaded()) << step;
        EXPECT_THAT(session.run(std::vector<float>(7)), IsEmpty()) << step;
        session.load(testModel("direct"), true);
        EXPECT_EQ(session.run(std::vector<float>(7)).size(), 6u) << step; // nothing is left of the failure
    }
    EXPECT_EQ(liveObjects(), before);
}

TEST(RuntimeFaults, EveryStepOfARunCanFail) {
    const int before = liveObjects();
    {
        ModelSession session;
        session.load(testModel("direct"), true);
        for (const auto& step :
             {arm<&OrtApi::CreateCpuMemoryInfo>, arm<&OrtApi::CreateTensorWithDataAsOrtValue>, arm<&OrtApi::Run>}) {
            step();
            EXPECT_THAT(session.run(std::vector<float>(7)), IsEmpty());
            EXPECT_EQ(session.errorText(), "armed");
            EXPECT_EQ(session.run(std::vector<float>(7)).size(), 6u);
        }
    }
    EXPECT_EQ(liveObjects(), before);
}

TEST(RuntimeFaults, NamesAndShapesAreReadOncePerLoad) {
    const auto reads = [] {
        return Hook<&OrtApi::SessionGetInputName>::calls + Hook<&OrtApi::SessionGetOutputName>::calls +
               Hook<&OrtApi::GetDimensions>::calls;
    };
    const int before = reads();
    ModelSession session;
    session.load(testModel("direct"), true);
    session.run(std::vector<float>(7));
    session.run(std::vector<float>(7));
    session.inputCount();
    EXPECT_EQ(reads(), before + 4);
}
