// SPDX-License-Identifier: Apache-2.0
// What a plug is inside.
#pragma once

#include "graph/Node.h"
#include "openquarn/HPlug.h"

#include <memory>
#include <optional>
#include <vector>

/// A node and the way to a slot: for each array on the way, outermost first, the index of an element. The last index of
/// a plug on a whole array is missing; so are indices that have not been chosen yet.
struct HPlug::Impl {
    std::shared_ptr<OpenQuarn::Node> node;
    const OpenQuarn::Field* field = nullptr;
    std::vector<std::optional<unsigned>> indices;

    bool operator==(const Impl& other) const {
        return node == other.node && field == other.field && indices == other.indices;
    }
};

namespace OpenQuarn {

/// The plug of a slot; null for one that has been cut off.
HPlug makePlug(const Slot& slot);

/// The slot in the data of a context; null when the plug is null, an index is not chosen, or an element does not exist.
/// `create` makes elements that are missing.
std::shared_ptr<Slot> resolvePlug(Context* context, const HPlug& plug, bool create = false);
/// The same in given data of its node.
std::shared_ptr<Slot> resolvePlugIn(const NodeData& data, const HPlug& plug, bool create);

/// The slot of the plug, or the nearest one above it that exists; null for a null plug.
std::shared_ptr<Slot> nearestExisting(Context* context, const HPlug& plug);

/// The slot that a plug's value comes from when it is evaluated. An element that does not exist may come into being
/// with the evaluation: of an output it is made, below a connected array the array is evaluated first. Null as for
/// resolvePlug().
std::shared_ptr<Slot> slotToEvaluate(Context* context, const HPlug& plug);

/// The slot of a plug in the normal context, made where it is missing, for as long as it is not clear whether it is
/// needed: what was made is taken away again unless keep() is called.
class TentativeSlot {
public:
    explicit TentativeSlot(const HPlug& plug);
    ~TentativeSlot();
    TentativeSlot(const TentativeSlot&) = delete;
    TentativeSlot& operator=(const TentativeSlot&) = delete;
    /// Null when the plug does not name one place.
    Slot* get() const { return slot_.get(); }
    bool isNew() const { return made_ != nullptr; }
    void keep() { made_ = nullptr; }

private:
    std::shared_ptr<Slot> slot_;
    Slot* made_ = nullptr; // the outermost element that was made
};

/// The plug behind a handle; null for a null plug, or one whose node has gone.
const HPlug::Impl* plugImpl(const HPlug& plug);
HPlug plugOf(HPlug::Impl impl);

/// The number of arrays at and above a field.
std::size_t arrayDepth(const Field& field);

} // namespace OpenQuarn
