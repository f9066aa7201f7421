// SPDX-License-Identifier: Apache-2.0
// The place of one value: of an attribute on a node, of an element of an array, of a child of a compound.
#pragma once

#include "graph/Attribute.h"
#include "graph/SparseArray.h"

#include <atomic>
#include <cstdint>
#include <memory>
#include <string>
#include <vector>

namespace OpenQuarn {

class NodeClass;
class NodeData;

/// Slots form a tree for each node: the slot of an array holds its elements, the slot of a compound (or of an element
/// of an array of compounds) its children, any other slot a value. Handles share in a slot; one whose element has been
/// removed is cut off from its node (`owner` and `parent` are null) and reaches nobody.
///
/// Thread: an evaluation reads clean slots from several threads; a slot that is not clean is written by the one thread
/// that computes it (evaluation.h). Everything else belongs to the main thread, outside of evaluations.
class Slot : public std::enable_shared_from_this<Slot> {
public:
    /// Connections that begin or end here.
    struct Links {
        Slot* source = nullptr;
        std::vector<Slot*> destinations; ///< in order of connection
    };

    Slot(const Field& slotField, NodeData* slotOwner, Slot* slotParent, bool element, unsigned logicalIndex);
    ~Slot();
    Slot(const Slot&) = delete;
    Slot& operator=(const Slot&) = delete;

    const Field& field;
    NodeData* owner;
    Slot* parent;
    const bool isElement;
    const unsigned index; ///< of an element

    // the value
    double number = 0.0;
    std::shared_ptr<Data> data;

    /// True for the slot that holds the elements of an array attribute.
    bool isArray() const { return field.isArray() && !isElement; }
    bool isCompound() const { return field.isCompound() && !isArray(); }
    bool isLeaf() const { return !isArray() && !isCompound(); }

    std::vector<std::shared_ptr<Slot>> children; ///< of a compound, in the order of its attributes
    SparseArray<Slot> elements;                  ///< of an array

    std::unique_ptr<Links> links; ///< null while nothing was ever connected
    bool locked = false;

    Slot* source() const { return links ? links->source : nullptr; }
    bool hasDestinations() const { return links && !links->destinations.empty(); }

    /// The element with that index; made, with default values, when it is missing. Marks what it makes as dirty when it
    /// is an output.
    std::shared_ptr<Slot> elementAt(unsigned logicalIndex);
    /// Puts an element that was made for this array (ArrayBuild) in its place.
    void adopt(const std::shared_ptr<Slot>& element);
    std::shared_ptr<Slot> child(const Field& childField) const;

    /// Calls visit(slot) for the direct parts: children or elements.
    template <class Visit>
    void forEachPart(Visit&& visit) const {
        for (const std::shared_ptr<Slot>& part : children)
            visit(*part);
        elements.forEach([&](unsigned, const std::shared_ptr<Slot>& part) { visit(*part); });
    }

    /// Gives it, and everything below, default values; removes elements.
    void reset();
    /// Takes over the values of a slot of the same kind, as a connection does; elements and children too. Data is
    /// shared.
    void copyFrom(const Slot& from);
    /// Breaks all connections here and below, without telling anybody.
    void unlink();
    /// Cuts it and everything below off from its node, and from what it is connected to.
    void detach();
    /// Keeps the type of `like` for as long as this slot lives: a handle may outlive node and plug-in.
    void keepTypeOf(const Slot& like);

    /// "list[3].child"
    std::string path() const;
    /// "node.list[3].child"
    std::string name() const;

    // --- dirtiness ---
    /// It and everything below has to be evaluated before it is read.
    bool isDirty() const { return (state_.load(std::memory_order_acquire) & dirtyBit) != 0; }
    /// It or something below may have to be evaluated.
    bool mayBeDirty() const {
        return (state_.load(std::memory_order_acquire) & (dirtyBit | belowBit | passedOverBit)) != 0;
    }
    /// Its last compute failed.
    bool hasFailed() const { return (state_.load(std::memory_order_acquire) & failedBit) != 0; }
    void setFailed(bool failed);
    /// Marks this slot and everything below, and tells the slots above.
    void markDirty();
    /// Marks this slot and everything below as up to date.
    void markClean();
    /// Marks a slot whose value was not made although what depends on it is up to date: who reads it has to evaluate
    /// it, and a change that reaches it still makes everything dirty that depends on it.
    void markPassedOver();

private:
    static constexpr std::uint8_t dirtyBit = 1;  // everything here and below
    static constexpr std::uint8_t belowBit = 2;  // something below, perhaps
    static constexpr std::uint8_t failedBit = 4; // the last compute failed
    static constexpr std::uint8_t passedOverBit = 8;

    void attach(NodeData* newOwner);
    void cutOff();
    void markDirtyBelow();
    void tellAbove();
    void markCleanBelow();
    void makeChildren();

    std::atomic<std::uint8_t> state_{0};
    std::shared_ptr<const NodeClass> type_; // of a slot without an owner
};

} // namespace OpenQuarn
