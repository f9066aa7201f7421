// SPDX-License-Identifier: Apache-2.0
#include "quarn/console/build.h"

#include "quill/InstructionSet.h"

namespace quarn {
namespace {

std::string& currentId() {
    static std::string id = "unknown";
    return id;
}

} // namespace

std::string buildId() {
    return currentId();
}

void setBuildId(const std::string& id) {
    currentId() = id;
}

std::string instructionSet() {
    switch (quill::instructionSet()) {
    case quill::InstructionSet::avx:
        return "AVX";
    case quill::InstructionSet::avx2:
        return "AVX2";
    case quill::InstructionSet::avx512:
        return "AVX-512";
    case quill::InstructionSet::plain:
        break;
    }
    return "scalar";
}

} // namespace quarn
