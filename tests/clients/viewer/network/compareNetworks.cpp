// SPDX-License-Identifier: Apache-2.0
// compareNetworks FOLDER: computes every network NAME.onnx of a folder as a page does and by the runtime, and prints by
// how much they differ in parts of the largest output. Fails where that is more than the limit, where a network is
// refused without a NAME.txt, or in other words than there, and when there are none.
#include <algorithm>
#include <cmath>
#include <cstdio>
#include <exception>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <random>
#include <string>
#include <vector>

#include "nw_model/ModelSession.h"
#include "nw_model/OnnxGraph.h"
#include "quarn/view/networkProgram.h"
#include "support/failureOf.h"
#include "viewer/Network.h"

namespace fs = std::filesystem;

namespace {

constexpr double limit = 1e-6;

viewer::Network networkOf(const fs::path& path) {
    const quarn::NetworkProgram program = quarn::networkProgram(neuralWarp::readOnnxGraph(path));
    return {program.words, program.constants};
}

/// Largest difference in parts of the largest output, over controls in the usual range and far out.
double differenceOf(viewer::Network& network, neuralWarp::ModelSession& session) {
    std::mt19937 random(1);
    double scale = 0.0;
    double difference = 0.0;
    for (int row = 0; row < 60; ++row) {
        std::uniform_real_distribution<float> range(-1.0F, 1.0F);
        std::vector<float> controls(network.inputCount());
        for (float& control : controls)
            control = range(random) * (row < 40 ? 1.5F : 30.0F);
        const std::vector<float> wanted = session.run(controls);
        const std::vector<float> got = network.run(controls);
        if (wanted.empty() || got.size() != wanted.size())
            return INFINITY;
        for (std::size_t i = 0; i < got.size(); ++i) {
            scale = std::max(scale, std::fabs(double{wanted[i]}));
            difference = std::max(difference, std::fabs(double{got[i]} - double{wanted[i]}));
        }
    }
    return difference / scale;
}

bool isComputed(const fs::path& path) {
    neuralWarp::ModelSession session;
    session.load(path, true);
    viewer::Network network = networkOf(path);
    const double difference = differenceOf(network, session);
    std::printf("%-24s %.1e %s\n", path.stem().c_str(), difference, session.errorText().c_str());
    return difference <= limit;
}

bool isRefused(const fs::path& path, const fs::path& words) {
    std::ifstream file(words);
    const std::string wanted{std::istreambuf_iterator<char>(file), {}};
    const std::string said = failureOf([&] { networkOf(path); });
    std::printf("%-24s %s\n", path.stem().c_str(), said.c_str());
    return said.find(wanted) != std::string::npos;
}

bool isRight(const fs::path& path) {
    const fs::path words = fs::path(path).replace_extension(".txt");
    try {
        return fs::exists(words) ? isRefused(path, words) : isComputed(path);
    } catch (const std::exception& error) {
        std::printf("%-24s %s\n", path.stem().c_str(), error.what());
        return false;
    }
}

} // namespace

int main(int count, char** arguments) {
    if (count != 2)
        return 2;
    int networks = 0;
    int wrong = 0;
    for (const fs::directory_entry& entry : fs::directory_iterator(arguments[1])) {
        if (entry.path().extension() != ".onnx")
            continue;
        const bool right = isRight(entry.path());
        std::printf("%s", right ? "" : "  that is WRONG\n");
        ++networks;
        wrong += right ? 0 : 1;
    }
    std::printf("%d networks, %d wrong\n", networks, wrong);
    return networks == 0 || wrong != 0 ? 1 : 0;
}
