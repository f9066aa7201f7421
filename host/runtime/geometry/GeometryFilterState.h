// SPDX-License-Identifier: Apache-2.0
// What the host keeps of each geometry of a filter from one evaluation to the next.
#pragma once

#include "geometry/GeometryDevice.h"
#include "geometry/IndexMap.h"
#include "graph/Node.h"

#include <map>
#include <mutex>
#include <vector>

namespace OpenQuarn {

/// What a geometry's first state was built from: when it is no longer the same, the plug-in builds it anew.
struct GeometrySources {
    std::weak_ptr<Slot> inputConnection, restConnection; ///< the plugs it comes from; empty for none
    std::shared_ptr<const Topology> input, rest;         ///< null: no rest geometry
    std::shared_ptr<const Positions> restPoints;
    std::string expression;
    std::shared_ptr<const IndexMap> affected;

    /// Contents are compared where they are not shared.
    bool sameAs(const GeometrySources& other) const;
};

/// Thread: the one that evaluates the geometry, or main; affectedVertices() any.
class GeometryState {
public:
    /// The vertices that an expression (text data, or null) stands for on a mesh; the last answer is kept. Null when
    /// there is no such component tag.
    std::shared_ptr<const IndexMap> affectedVertices(const MeshData& mesh, const std::shared_ptr<Data>& expression);

    /// True when the plug-in has to be told to start anew with this geometry: from() says what it then starts from.
    bool isStale(const GeometrySources& now) const { return !initialized_ || !sources_.sameAs(now); }
    void initializedFrom(GeometrySources sources);
    void notInitialized() { initialized_ = false; }

    /// The weights of the affected vertices, null when there are none. `list` the slot of the array of weights, which
    /// is up to date; null for none.
    const float* weights(const Slot* list, const std::shared_ptr<const IndexMap>& affected);
    void weightsChanged() { weightsMap_ = nullptr; }
    /// Another one after each time that weights() gathered them anew; above 0.
    std::uint64_t weightsVersion() const { return weightsVersion_; }

    const std::shared_ptr<PositionPool> pool = std::make_shared<PositionPool>();
    std::unique_ptr<DeviceGeometry> onDevice; ///< null: not evaluated yet since the device is on

private:
    std::mutex mutex_; // of the three below
    std::shared_ptr<const IndexMap> affected_;
    std::shared_ptr<const ComponentTags> tags_;
    std::shared_ptr<Data> expression_;

    bool initialized_ = false;
    GeometrySources sources_;
    std::vector<float> weights_;
    std::uint64_t weightsVersion_ = 1;
    std::shared_ptr<const IndexMap> weightsMap_; // what the weights were gathered for; null: not up to date
};

class GeometryFilterState final : public FilterState {
public:
    explicit GeometryFilterState(NodeData& data)
        : data_(data) {}
    void changed(Slot& slot) override;
    void edited(Slot& slot) override;
    void connectionsChanged() override;
    void nodeIsGoing() override { takeFromDevice(); }

    /// Made when there is none yet. Thread: any.
    std::shared_ptr<GeometryState> geometry(unsigned index);
    /// Takes all geometries from the device. Thread: main, outside of evaluations.
    void takeFromDevice();
    /// Forgets a geometry that has no input any more. Thread: any.
    void forget(unsigned index);

private:
    void weightsChanged(const Slot& slot);
    void makeOutputs(const Slot& slot);

    NodeData& data_;
    std::mutex mutex_;
    std::map<unsigned, std::shared_ptr<GeometryState>> geometries_;
};

std::unique_ptr<FilterState> makeGeometryFilterState(NodeData& data);

/// The state of a filter's data; throws std::invalid_argument for the data of another kind of node.
GeometryFilterState& filterStateOf(const NodeData& data);

/// The element with that index of one of the node's arrays; null when there is none.
std::shared_ptr<Slot> elementOf(const NodeData& data, const Attribute& array, unsigned index);

} // namespace OpenQuarn
