// SPDX-License-Identifier: Apache-2.0
// The place of one value: of an attribute on a node, of an element of an array, of a child of a compound.
#pragma once

#include "graph/SparseArray.h"
#include "types/Attribute.h"

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
    /// What few slots have.
    struct Rare {
        /// Slots of which a plug-in said that this one depends on them (HPxNode::setDependentsDirty).
        std::vector<std::weak_ptr<Slot>> announcers;
        std::shared_ptr<const NodeClass> type; ///< of a slot without an owner
    };
    /// Connections that begin or end here.
    struct Links {
        Slot* source = nullptr;
        std::vector<Slot*> destinations; ///< in order of connection
        std::unique_ptr<Rare> rare;      ///< null for none
    };

    Slot(const Field& slotField, NodeData* slotOwner, Slot* slotParent, bool element, unsigned logicalIndex);
    ~Slot();
    Slot(const Slot&) = delete;
    Slot& operator=(const Slot&) = delete;

    const Field& field;
    NodeData* owner;
    Slot* parent;

    // the value
    double number = 0.0;
    std::shared_ptr<Data> data;

    std::unique_ptr<Links> links; ///< null while nothing was ever connected, nor anything rare

    const unsigned index; ///< of an element
    const bool isElement;
    bool locked = false;

    /// True for the slot that holds the elements of an array attribute.
    bool isArray() const { return field.isArray() && !isElement; }
    bool isCompound() const { return field.isCompound() && !isArray(); }
    bool isLeaf() const { return !isArray() && !isCompound(); }

    /// Of a compound, in the order of its attributes; none for other slots.
    const std::vector<std::shared_ptr<Slot>>& children() const {
        return parts_ ? parts_->children : noParts().children;
    }
    /// Of an array; none for other slots.
    const SparseArray<Slot>& elements() const { return parts_ ? parts_->elements : noParts().elements; }
    /// Of an array only: to change them.
    SparseArray<Slot>& ownElements() { return parts_->elements; }

    Slot* source() const { return links ? links->source : nullptr; }
    bool hasDestinations() const { return links && !links->destinations.empty(); }

    /// The element with that index; made, with default values, when it is missing. Marks what it makes as dirty when it
    /// is an output, or the array is dirty.
    std::shared_ptr<Slot> elementAt(unsigned logicalIndex);
    /// Puts an element that was made for this array (ArrayBuild) in its place. Within a ParallelGraphLock
    /// (arrayLock.h).
    void adopt(const std::shared_ptr<Slot>& element);
    /// Takes an element away and cuts it off; nothing happens when there is none. Within a ParallelGraphLock.
    void removeElement(unsigned logicalIndex);
    std::shared_ptr<Slot> child(const Field& childField) const;

    /// Calls visit(slot) for the direct parts: children or elements.
    template <class Visit>
    void forEachPart(Visit&& visit) const {
        if (!parts_)
            return;
        for (const std::shared_ptr<Slot>& part : parts_->children)
            visit(*part);
        parts_->elements.forEach([&](unsigned, const std::shared_ptr<Slot>& part) { visit(*part); });
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
    /// Keeps the type of `like` until it is adopted, or for as long as it lives: a handle may outlive node and plug-in.
    void keepTypeOf(const Slot& like);
    /// Made where there is none.
    Rare& rare();

    /// "list[3].child"
    std::string path() const;
    /// "node.list[3].child"
    std::string name() const;

    // --- dirtiness: whether it has to be evaluated, and whether what depends on it knows (dirty.h) ---
    /// It and everything below has to be evaluated before it is read.
    bool isDirty() const { return has(dirtyBit); }
    /// It or something below may have to be evaluated.
    bool mayBeDirty() const { return has(dirtyBit | belowBit); }
    /// It is dirty, and everything that depends on it is dirty and has told in its turn: another change of it is no
    /// news to anybody.
    bool hasTold() const { return has(toldBit); }
    /// It or something below may have told.
    bool mayHaveTold() const { return has(toldBit | toldBelowBit); }
    /// Its last compute failed.
    bool hasFailed() const { return has(failedBit); }
    void setFailed(bool failed);
    /// Marks this slot and everything below, and tells the slots above.
    void markDirty();
    /// The same for one whose dependents are about to be marked, too.
    void markTold();
    /// Marks this slot and everything below as up to date. When it had told, what it may depend on has told no longer.
    void markClean();
    /// Takes back that this slot and everything below has told; what is above it has not told as a whole then. What it
    /// may depend on is left to forgetToldUpstream().
    void forgetTold();

private:
    static constexpr std::uint8_t dirtyBit = 1;      // everything here and below
    static constexpr std::uint8_t belowBit = 2;      // something below, perhaps
    static constexpr std::uint8_t failedBit = 4;     // the last compute failed
    static constexpr std::uint8_t toldBit = 8;       // everything here and below
    static constexpr std::uint8_t toldBelowBit = 16; // something below, perhaps

    bool has(std::uint8_t anyOf) const { return (state_.load(std::memory_order_acquire) & anyOf) != 0; }
    void drop(std::uint8_t bits);
    void mark(std::uint8_t bits);
    void markBelow(std::uint8_t bits);
    void markCleanBelow();
    void forgetToldBelow();
    void attach(NodeData* newOwner);
    void cutOff(const std::shared_ptr<const NodeClass>& type);
    std::shared_ptr<const NodeClass> keptType() const;
    void makeChildren();

    struct Parts {
        std::vector<std::shared_ptr<Slot>> children;
        SparseArray<Slot> elements;
    };
    static const Parts& noParts();

    std::atomic<std::uint8_t> state_{0};
    std::unique_ptr<Parts> parts_; // null for a leaf: most slots are one number of many
};

/// The element of the outermost array that a slot is, or is below; null when it is in none.
const Slot* outermostElement(const Slot& slot);

} // namespace OpenQuarn
