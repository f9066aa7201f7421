// SPDX-License-Identifier: Apache-2.0
// Characters of a page, made at random.
#pragma once

#include "support/meshZoo.h"
#include "viewer/Blocks.h"

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <filesystem>
#include <map>
#include <string>
#include <vector>

/// What is wanted of a character; the rest is drawn by the seed.
struct SampleOptions {
    std::uint32_t seed = 1;
    std::size_t subdivisions = 2; ///< of the icosphere that it is
    std::size_t grid = 0;         ///< or, above 0, quads along each side of the grid
    std::uint32_t frames = 4;
    std::uint32_t controls = 9;
    std::uint32_t shapes = 7;    ///< principal shapes; 0: the network gives deltas
    std::size_t basisBytes = 4;  ///< of a number
    std::uint32_t deltaMode = 1; ///< 0 offset, 1 surface
    std::uint32_t passes = 5;
    bool isPartial = false; ///< the model drives some of the vertices
    bool hasWeights = false, hasEnvelope = false;
    bool takesPoints = false; ///< instead of a skin
    bool hasRig = true;
    bool hasSeams = false;       ///< some vertices are drawn as two
    bool hasTargetPoints = true; ///< false: errors
    std::uint32_t hidden = 0;    ///< width of a layer within the network; 0: outputs are multiples of controls, exactly
};

/// The blocks, to be read and spoilt.
class SampleCharacter {
public:
    explicit SampleCharacter(const SampleOptions& options);

    const SampleOptions& options() const { return options_; }
    const ZooMesh& mesh() const { return mesh_; }
    /// The numbers that the basis stands for [slots][shapes][3].
    const std::vector<float>& basis() const { return basis_; }

    std::map<std::string, std::vector<std::byte>>& bytes() { return bytes_; }
    template <class T>
    void put(const std::string& name, const std::vector<T>& values) {
        const auto bytes = std::as_bytes(std::span(values));
        bytes_[name].assign(bytes.begin(), bytes.end());
    }
    template <class T>
    std::vector<T> get(const std::string& name) const {
        const std::vector<std::byte>& bytes = bytes_.at(name);
        std::vector<T> values(bytes.size() / sizeof(T));
        if (!values.empty())
            std::memcpy(values.data(), bytes.data(), bytes.size());
        return values;
    }
    viewer::Blocks blocks() const;
    /// Stores the sums of these frames, as the core has them now.
    void addChecks(const std::vector<std::uint32_t>& frames);
    /// Writes each block into a file of its name.
    void write(const std::filesystem::path& folder) const;

private:
    void addMesh();
    void addModel();
    void addNetwork(std::size_t outputs);
    void addSkin();
    void addRig();
    void addMotion();
    std::vector<double> randoms(std::size_t count, double least, double most);
    std::uint32_t below(std::size_t end);
    /// [count][16] turned and scaled a little, and moved.
    std::vector<double> matrices(std::size_t count);

    SampleOptions options_;
    std::uint64_t state_;
    ZooMesh mesh_;
    std::vector<float> basis_;
    std::map<std::string, std::vector<std::byte>> bytes_;
    std::size_t n_ = 0, slots_ = 0;
};
