// SPDX-License-Identifier: Apache-2.0
// The buffers of a geometry's state, as they are handed to the host's GPU framework.
#pragma once

#include "deformer/neuralWarpData.h"
#include "openquarn/HObject.h"

#include <string_view>

namespace neuralWarp {

/// A copy of a buffer as an array object of the host; null for a name that is none of these (case counts):
///   "Sync"                         cacheVersions                                     uint32
///   "FramesIndexer"                vertexFrames.framesIndexer()                      uint32
///   "FramesPairs"                  vertexFrames.framesPairs()                        uint32
///   "Connections"                  vertexConnections.connections()                   uint32
///   "ConnectionsIndexer"           vertexConnections.connectionsIndexer()            uint32
///   "ConnectionWeights"            connectionWeights                                 float
///   "AffectToDeltaMap"             affectMap                                         uint32
///   "OriginalVerts"                restPoints                                        3 floats
///   "SmoothOriginalFramesInverse"  restFramesInverse                                 4 x 4 doubles
///   "PrincipalShapesData"          principalShapes                                   float
/// Throws std::bad_alloc. [any]
HObject namedBuffer(const neuralWarpData& data, std::string_view name);

} // namespace neuralWarp
