// SPDX-License-Identifier: Apache-2.0
// Base class of the node types that a plug-in registers.
#pragma once

#include "openquarn/HDataBlock.h"
#include "openquarn/HPlug.h"
#include "openquarn/HStringArray.h"

#include <memory>

class HExternalContentInfoTable;
class HExternalContentLocationTable;

namespace OpenQuarn {
class NodeClass;
} // namespace OpenQuarn

/// The host creates a node through its type's creator, calls postConstructor(), and destroys it when the node is
/// deleted. The functions a plug-in overrides are called on the threads that their tags name; whatever they throw
/// becomes a failing status and a message that names the node.
class OPENQUARN_API HPxNode {
public:
    /// Kinds of node types, given at registration.
    enum Type : int { kDependNode = 0, kDeformerNode = 1, kGeometryFilterNode = 2 };

    HPxNode();
    HPxNode(const HPxNode&) = delete;
    HPxNode& operator=(const HPxNode&) = delete;
    virtual ~HPxNode();

    /// Called once after the node has its name and its values, before anybody else sees it. When it throws, the node is
    /// not created: it is taken away, and whoever asked for it gets the failure. [main]
    virtual void postConstructor();
    /// Brings `plug`, an output, up to date: read inputs, write outputs, set them clean. Answer kUnknownParameter for a
    /// plug that this type does not produce; the host then takes its value as it is. Called only for a dirty plug. Of
    /// plain nodes one is computed at a time, in a parallel evaluation too; geometry filters run side by side inside of
    /// deform(), one thread for one geometry. [eval]
    virtual HStatus compute(const HPlug& plug, HDataBlock& block);
    /// Adds to `affected` what becomes dirty with `dirty` beyond the declared dependencies. May not change the graph.
    /// [main]
    virtual HStatus setDependentsDirty(const HPlug& dirty, HPlugArray& affected);
    /// Called after a connection has been made or broken: `plug` is this node's side, `asSource` says which it is. May
    /// change the graph, and even delete the node; what is connected again to a node that is being deleted is let go.
    /// [main]
    virtual HStatus connectionMade(const HPlug& plug, const HPlug& otherPlug, bool asSource);
    virtual HStatus connectionBroken(const HPlug& plug, const HPlug& otherPlug, bool asSource);
    /// The files that the node needs besides the scene. `unresolvedName` asks for them as they are written in the
    /// attributes. The base returns the text of every attribute that is used as a file name. [main]
    virtual HStringArray getFilesToArchive(bool shortName = false, bool unresolvedName = false,
                                           bool markCouldBeImageSequence = false) const;
    /// Tells the table of external files, and takes changed places back from it. [main]
    virtual void getExternalContent(HExternalContentInfoTable& table) const;
    virtual void setExternalContent(const HExternalContentLocationTable& table);

    /// The node as an object, in the constructor too; null for an object that the host did not create. [any]
    HObject thisHObject() const;
    HString name() const;
    HString typeName() const;
    HTypeId typeId() const;
    /// The node's data outside of compute(), in the current context. Evaluates nothing by itself. [eval]
    HDataBlock forceCache();

    /// For a type's initializer, while the type is being registered. [main]
    /// Adds an attribute with its children. Fails when one of the names is taken.
    static HStatus addAttribute(const HObject& attribute);
    /// Declares that `affected` depends on `affecting`: when the latter changes, all of the former becomes dirty, with
    /// its elements and children. Fails when one is, or is a part of, the other.
    ///
    /// A change of an attribute is a change of its own plug or of one above it. With `affectsTree`, a change of
    /// anything below `affecting` counts as well. So for a compound `pair` with the children `a` and `b`:
    ///   attributeAffects(pair, out)        connecting `pair` makes `out` dirty; setting `pair.a` does not
    ///   attributeAffects(a, out)           setting or connecting `pair.a`, or connecting `pair`, does; `pair.b` does
    ///   not attributeAffects(pair, out, true)  everything does
    /// The first is seldom meant alone: a warning says so when no child of `pair` affects `out` itself.
    static HStatus attributeAffects(const HObject& affecting, const HObject& affected);
    static HStatus attributeAffects(const HObject& affecting, const HObject& affected, bool affectsTree);

    /// The attribute "message" that every node has: a source without a value.
    static const HObject message;

protected:
    /// Adds the path in a text attribute of this node to the table, under the attribute's name. Fails when the
    /// attribute holds no text. [main]
    HStatus addExternalContentForFileAttr(HExternalContentInfoTable& table, const HObject& attribute) const;
    /// Sets the attribute to the place that the table has for it; does nothing, with success, when it has none. [main]
    HStatus setExternalContentForFileAttr(const HObject& attribute, const HExternalContentLocationTable& table);

private:
    friend class OpenQuarn::Access;
    std::weak_ptr<OpenQuarn::Node> impl_;
};
