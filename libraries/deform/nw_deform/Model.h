// SPDX-License-Identifier: Apache-2.0
// A trained model, without a mesh.
#pragma once

#include "frame/DeltaSettings.h"
#include "frame/FrameModel.h"
#include "frame/PrincipalBasis.h"
#include "nw_model/DirectoryState.h"
#include "nw_model/ModelCertificate.h"
#include "nw_model/ModelMetadata.h"
#include "nw_model/ModelSession.h"
#include "nw_model/TrainedPoses.h"
#include "quill/IndexMapper.h"

#include <cstddef>
#include <filesystem>
#include <memory>
#include <mutex>
#include <optional>
#include <span>
#include <stdexcept>
#include <string>
#include <vector>

namespace neuralWarp {

/// Something that should be read is not there.
struct FileMissing : std::runtime_error {
    using std::runtime_error::runtime_error;
};

/// The vertices that a model drives, by its slots: those of the metadata, not checked, of a mesh of its fullCount.
quill::IndexMapper trainedVertices(const ModelMetadata& metadata);

/// What a model directory holds. Immutable: any thread, several at once.
class Model {
public:
    /// Reads a model directory, all of it, and runs its network once. Prints nothing.
    ///   directory  relative ones count from the current folder, which may be another one later
    /// A directory that somebody exchanges or writes into meanwhile is read anew: what is given is of one state.
    /// Throws FileMissing when it, its metadata or its network is not there, and std::invalid_argument when it is of no
    /// use; both name the file and the reason. Stricter than the plug-in, which takes what it can.
    static std::shared_ptr<const Model> load(const std::filesystem::path& directory);

    /// Absolute.
    const std::filesystem::path& directory() const { return directory_; }
    /// The bytes of "metadata.json", a JSON object.
    const std::string& metadataText() const { return metadataText_; }
    const ModelMetadata& metadata() const { return metadata_; }
    DeltaSettings settings() const;
    /// The vertices that it drives, in the order of its slots.
    const quill::IndexMapper& vertices() const { return vertices_; }
    /// Values that the network takes.
    std::size_t controlCount() const { return controlCount_; }
    /// The principal shapes. A view of this object.
    ShapeBasis shapes() const { return {basis_, shapeCount_, slotCount_}; }

    /// What it says of itself; none when it says nothing, or what is damaged: certificateProblem() says why.
    const std::optional<ModelCertificate>& certificate() const { return certificate_; }
    /// What of the certificate and of the trained poses is missing, a sentence; empty where nothing is.
    const std::string& certificateProblem() const { return certificateProblem_; }
    /// Name of a control for a message, "control 3 ('elbow.x')", or its number alone.
    std::string controlCalled(std::size_t control) const;
    /// ControlRanges::distance() of controlCount() values. Throws std::invalid_argument without a certificate.
    double distance(std::span<const float> controls) const;
    /// The mean error that is to be expected of a frame, in mm (ExpectedError); none where that is not known.
    std::optional<double> expectedError(std::span<const float> controls) const;

    /// A session of the network for one user at a time, who gives it back. One that was given back, or a new one of the
    /// file. Throws std::invalid_argument when the directory is not the one any more that was loaded.
    std::unique_ptr<ModelSession> takeSession() const;
    void giveBack(std::unique_ptr<ModelSession> session) const noexcept;

private:
    Model(std::filesystem::path directory, const DirectoryState& state);
    void readCertificate();
    void checkOutputs(ModelSession& session) const;

    std::filesystem::path directory_;
    DirectoryState state_;
    std::string metadataText_;
    ModelMetadata metadata_;
    quill::IndexMapper vertices_;
    PrincipalBasis basis_;
    std::uint64_t shapeCount_ = 0, slotCount_ = 0;
    std::size_t controlCount_ = 0;
    std::optional<ModelCertificate> certificate_;
    TrainedPoses trainedPoses_;
    std::string certificateProblem_;

    mutable std::mutex mutex_;
    mutable std::vector<std::unique_ptr<ModelSession>> sessions_; // that nobody uses
};

} // namespace neuralWarp
