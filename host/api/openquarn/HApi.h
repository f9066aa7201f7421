// SPDX-License-Identifier: Apache-2.0
// OpenQuarn H-API: what every header of it shares, and the conventions that hold in all of them.
//
// Handles. H-classes are small copyable handles on objects that the host owns; copying one copies no data. A handle
// whose object has gone (a deleted node, a removed element, an unloaded plug-in's type) answers with a failing status
// or the empty value named at the call; it is never undefined behaviour.
//
// Errors. A call that can fail returns an HStatus, or takes `HStatus* status` as its last argument: may be null, and is
// written in every case, with success too. Nothing is thrown at the caller, and whatever a plug-in's own functions
// throw ends at the host as a failing status and a message.
//
// Numbers. Positions are doubles in object space unless a call says otherwise; angles are radians; matrices are 4 x 4,
// row-major, for row vectors (p' = p * M, translation in row 3).
//
// Threads. A call answers kFailure, and a debug build ends, on a thread that the tag of its documentation excludes:
//   [main]  the thread that the application runs the host on, outside of an evaluation;
//   [eval]  that thread, or a thread on which the host is evaluating a node at the moment;
//   [any]   every thread; two threads may call it at the same time on different objects.
#pragma once

#if defined(__GNUC__)
#define OPENQUARN_API __attribute__((visibility("default")))
#else
#define OPENQUARN_API
#endif

/// Version of the H-API, eight characters padded with NUL. A plug-in exports it, and the host compares, before it calls
/// anything else in the plug-in: `extern "C" OPENQUARN_API const char HApiVersion[8];`, initialised with this.
/// The part before the dot changes with every incompatible change, the part after it with every addition.
#define OPENQUARN_API_VERSION                                                                                          \
    { '2', '.', '0', '\0', '\0', '\0', '\0', '\0' }

namespace OpenQuarn {
class Access; // the runtime's way into the handles
class Node;
class NodeClass;
class Object; // what an HObject stands for
} // namespace OpenQuarn
