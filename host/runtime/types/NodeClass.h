// SPDX-License-Identifier: Apache-2.0
// A node type: its attributes, what depends on what, and how to make a node of it.
#pragma once

#include "openquarn/HPxNode.h"
#include "types/Attribute.h"

#include <cstddef>
#include <memory>
#include <string>
#include <unordered_map>
#include <unordered_set>
#include <vector>

namespace OpenQuarn {

class FilterState;
class NodeData;

/// Built once by registration, fixed afterwards.
class NodeClass {
public:
    using Creator = HPxNode* (*)();

    NodeClass(std::string typeName, HTypeId typeId, HFn::Type objectKind, Creator nodeCreator)
        : name(std::move(typeName))
        , id(typeId)
        , kind(objectKind)
        , creator(nodeCreator) {}

    const std::string name;
    const HTypeId id;
    const HFn::Type kind;  ///< of the nodes
    const Creator creator; ///< null for a type that cannot be created by itself
    std::unique_ptr<FilterState> (*makeFilterState)(NodeData&) = nullptr; ///< of geometry filters; types inherit it
    std::string plugin; ///< name of the plug-in that registered it; empty for the host's own

    /// Adds an attribute that has no parent, with its children. Throws std::invalid_argument when a name is taken.
    void add(const std::shared_ptr<Attribute>& attribute);
    /// Throws std::invalid_argument when one of them does not belong to the type, or is a part of the other.
    void affects(const Attribute& affecting, const Attribute& affected, bool affectsTree, bool sameElement = false);
    /// Adds what another type has, as the base of this one.
    void inherit(const NodeClass& base);
    /// Works out what depends on what; nothing is added afterwards.
    void finish();
    /// A sentence for each compound that was declared to affect something, while nothing below it does.
    std::vector<std::string> doubtfulDeclarations() const;

    const std::vector<std::unique_ptr<Field>>& fields() const { return fields_; }
    /// By long or short name, at any depth; null when there is none.
    const Field* find(const std::string& attributeName) const;
    const Field* find(const Attribute& attribute) const;

    /// One call of affects(). What was declared twice stands here twice.
    struct Declaration {
        const Field* affecting;
        const Field* affected;
        bool tree;
        bool sameElement;
        bool inherited;
    };
    /// In order, those of the base first.
    const std::vector<Declaration>& declarations() const { return declarations_; }
    /// True for what came from the base.
    bool isInherited(const Field& field) const;

private:
    struct Pair {
        Field* affecting;
        Field* affected;
        bool tree;
        bool sameElement;
    };

    /// Throws std::invalid_argument when a name of the attribute or below it is taken, here or in `names`.
    void checkNames(const Attribute& attribute, std::unordered_set<std::string>& names) const;
    std::unique_ptr<Field> makeField(const std::shared_ptr<const Attribute>& attribute, const Field* parent,
                                     unsigned position);
    Field& fieldOf(const Attribute& attribute) const;
    void addDependents(Field& field);
    static void addAffecting(Field& affected, const Field::Dependency& affecting);

    std::vector<std::unique_ptr<Field>> fields_;
    std::unordered_map<const Attribute*, Field*> byAttribute_;
    std::unordered_map<std::string, Field*> byName_;
    std::vector<Pair> pairs_;
    std::vector<Declaration> declarations_;
    std::size_t inheritedFields_ = 0; ///< at the front of fields_
};

/// The registered types. Thread: changes on the main thread, outside of evaluations.
std::shared_ptr<const NodeClass> findNodeClass(const std::string& name);
/// Throws std::invalid_argument naming what is in the way: the name or the id.
void addNodeClass(std::shared_ptr<const NodeClass> type);
/// By type id. Throws std::invalid_argument when there is none. The caller has made sure that no node of it exists.
void removeNodeClass(HTypeId id);
/// Sorted by name.
std::vector<std::shared_ptr<const NodeClass>> nodeClasses();
std::shared_ptr<const NodeClass> findNodeClass(HTypeId id);

/// While a type's initializer runs, the type that HPxNode::addAttribute() and attributeAffects() work on.
class ClassUnderConstruction {
public:
    explicit ClassUnderConstruction(NodeClass& type);
    ~ClassUnderConstruction();
    ClassUnderConstruction(const ClassUnderConstruction&) = delete;
    ClassUnderConstruction& operator=(const ClassUnderConstruction&) = delete;
    /// Null when none is.
    static NodeClass* current();

private:
    NodeClass* previous_;
};

} // namespace OpenQuarn
