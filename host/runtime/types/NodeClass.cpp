// SPDX-License-Identifier: Apache-2.0
#include "types/NodeClass.h"

#include "core/text.h"

#include <algorithm>
#include <map>
#include <stdexcept>

namespace OpenQuarn {
namespace {

bool isAbove(const Field& above, const Field& below) {
    for (const Field* at = below.parent; at; at = at->parent)
        if (at == &above)
            return true;
    return false;
}

} // namespace

void NodeClass::add(const std::shared_ptr<Attribute>& attribute) {
    if (!attribute->parent.expired())
        throw std::invalid_argument("attribute '" + attribute->name + "' is a child: add its parent");
    std::unordered_set<std::string> names;
    checkNames(*attribute, names);
    fields_.push_back(makeField(attribute, nullptr, static_cast<unsigned>(fields_.size())));
}

void NodeClass::checkNames(const Attribute& attribute, std::unordered_set<std::string>& names) const {
    const std::unordered_set<std::string> own{attribute.name, attribute.shortName};
    for (const std::string& key : own)
        if (byName_.count(key) != 0 || !names.insert(key).second)
            throw std::invalid_argument("node type '" + name + "' has an attribute named '" + key + "' already");
    for (const std::shared_ptr<Attribute>& child : attribute.children)
        checkNames(*child, names);
}

std::unique_ptr<Field> NodeClass::makeField(const std::shared_ptr<const Attribute>& attribute, const Field* parent,
                                            unsigned position) {
    auto field = std::make_unique<Field>();
    field->attribute = attribute;
    field->parent = parent;
    field->position = position;
    for (const std::string& key : {attribute->name, attribute->shortName})
        byName_[key] = field.get();
    byAttribute_[attribute.get()] = field.get();
    field->children.reserve(attribute->children.size());
    for (const std::shared_ptr<Attribute>& child : attribute->children)
        field->children.push_back(makeField(child, field.get(), static_cast<unsigned>(field->children.size())));
    const_cast<Attribute&>(*attribute).fixed = true;
    return field;
}

Field& NodeClass::fieldOf(const Attribute& attribute) const {
    const auto found = byAttribute_.find(&attribute);
    if (found == byAttribute_.end())
        throw std::invalid_argument("node type '" + name + "' has no attribute '" + attribute.name + "'");
    return *found->second;
}

void NodeClass::affects(const Attribute& affecting, const Attribute& affected, bool affectsTree, bool sameElement) {
    Field& from = fieldOf(affecting);
    Field& to = fieldOf(affected);
    if (&from == &to || isAbove(from, to) || isAbove(to, from))
        throw std::invalid_argument("attribute '" + affecting.name + "' of node type '" + name + "' cannot affect " +
                                    (&from == &to ? "itself" : "'" + affected.name + "', with which it overlaps"));
    declarations_.push_back({&from, &to, affectsTree, sameElement, false});
    for (Pair& pair : pairs_)
        if (pair.affecting == &from && pair.affected == &to) {
            pair.tree = pair.tree || affectsTree; // declared again, by a derived type: what the base said of it stays
            return;
        }
    pairs_.push_back({&from, &to, affectsTree, sameElement});
}

void NodeClass::inherit(const NodeClass& base) {
    makeFilterState = base.makeFilterState;
    for (const std::unique_ptr<Field>& field : base.fields_)
        fields_.push_back(makeField(field->attribute, nullptr, static_cast<unsigned>(fields_.size())));
    inheritedFields_ = fields_.size();
    for (const Declaration& made : base.declarations_)
        affects(*made.affecting->attribute, *made.affected->attribute, made.tree, made.sameElement);
    for (Declaration& made : declarations_)
        made.inherited = true;
}

bool NodeClass::isInherited(const Field& field) const {
    return field.parent ? isInherited(*field.parent) : field.position < inheritedFields_;
}

std::vector<std::string> NodeClass::doubtfulDeclarations() const {
    std::vector<std::string> doubts;
    for (const Pair& pair : pairs_) {
        const bool hasOwn = std::any_of(pairs_.begin(), pairs_.end(), [&](const Pair& other) {
            return other.affected == pair.affected && isAbove(*pair.affecting, *other.affecting);
        });
        if (pair.affecting->isCompound() && !pair.tree && !hasOwn)
            doubts.push_back("node type '" + name + "': a change of a child of '" + pair.affecting->attribute->name +
                             "' does not count for '" + pair.affected->attribute->name +
                             "': neither the children affect it nor the whole tree");
    }
    return doubts;
}

void NodeClass::finish() {
    for (const Pair& pair : pairs_)
        pair.affected->computed = true;
    // children of an output come with it
    const auto inheritComputed = [](auto&& self, Field& field) -> void {
        for (const std::unique_ptr<Field>& child : field.children) {
            child->computed = child->computed || field.computed;
            self(self, *child);
        }
    };
    for (const std::unique_ptr<Field>& field : fields_)
        inheritComputed(inheritComputed, *field);
    for (const auto& [attribute, field] : byAttribute_)
        addDependents(*field);
    for (const Pair& pair : pairs_)
        addAffecting(*pair.affected, {pair.affecting, pair.sameElement});
}

// an output's children are computed with it
void NodeClass::addAffecting(Field& affected, const Field::Dependency& affecting) {
    affected.affectedBy.push_back(affecting);
    for (const std::unique_ptr<Field>& child : affected.children)
        addAffecting(*child, affecting);
}

// What depends on a field: what it affects itself, what a field above it affects with its whole tree, and, since a
// change of a whole compound is a change of everything in it, what the fields below it affect.
void NodeClass::addDependents(Field& field) {
    for (const Pair& pair : pairs_) {
        const bool counts = pair.affecting == &field || (pair.tree && isAbove(*pair.affecting, field)) ||
                            isAbove(field, *pair.affecting);
        const bool listed =
            std::any_of(field.dependents.begin(), field.dependents.end(),
                        [&](const Field::Dependency& dependent) { return dependent.field == pair.affected; });
        if (counts && !listed && pair.affected != &field)
            field.dependents.push_back({pair.affected, pair.sameElement});
    }
}

const Field* NodeClass::find(const std::string& attributeName) const {
    const auto found = byName_.find(attributeName);
    return found == byName_.end() ? nullptr : found->second;
}

const Field* NodeClass::find(const Attribute& attribute) const {
    const auto found = byAttribute_.find(&attribute);
    return found == byAttribute_.end() ? nullptr : found->second;
}

namespace {

std::map<std::string, std::shared_ptr<const NodeClass>>& classes() {
    static std::map<std::string, std::shared_ptr<const NodeClass>> types;
    return types;
}

thread_local NodeClass* underConstruction = nullptr;

} // namespace

std::shared_ptr<const NodeClass> findNodeClass(const std::string& name) {
    const auto found = classes().find(name);
    return found == classes().end() ? nullptr : found->second;
}

std::shared_ptr<const NodeClass> findNodeClass(HTypeId id) {
    for (const auto& [name, type] : classes())
        if (type->id == id)
            return type;
    return nullptr;
}

void addNodeClass(std::shared_ptr<const NodeClass> type) {
    if (!isIdentifier(type->name))
        throw std::invalid_argument("'" + type->name + "' cannot name a node type");
    const std::shared_ptr<const NodeClass> sameName = findNodeClass(type->name);
    const std::shared_ptr<const NodeClass> other = sameName ? sameName : findNodeClass(type->id);
    if (other)
        throw std::invalid_argument("node type '" + type->name + "' (" + hexText(type->id) + ") is in the way of '" +
                                    other->name + "' (" + hexText(other->id) + "), which is registered");
    classes().emplace(type->name, std::move(type));
}

void removeNodeClass(HTypeId id) {
    const std::shared_ptr<const NodeClass> type = findNodeClass(id);
    if (!type)
        throw std::invalid_argument("no node type " + hexText(id) + " is registered");
    classes().erase(type->name);
}

std::vector<std::shared_ptr<const NodeClass>> nodeClasses() {
    std::vector<std::shared_ptr<const NodeClass>> all;
    all.reserve(classes().size());
    for (const auto& [name, type] : classes())
        all.push_back(type);
    return all;
}

ClassUnderConstruction::ClassUnderConstruction(NodeClass& type)
    : previous_(underConstruction) {
    underConstruction = &type;
}
ClassUnderConstruction::~ClassUnderConstruction() {
    underConstruction = previous_;
}
NodeClass* ClassUnderConstruction::current() {
    return underConstruction;
}

} // namespace OpenQuarn
