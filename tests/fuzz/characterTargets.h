// SPDX-License-Identifier: Apache-2.0
// What the fuzz targets of the reader of characters do with one input.
#pragma once

#include <cstddef>
#include <cstdint>

/// Checks the bytes as a glTF file, text or binary, and prepares it for the importer. Ends the process (abort) when
/// what was prepared is refused, or when a node is left without a name that stands for the file's. True when accepted.
bool fuzzGltf(const std::uint8_t* data, std::size_t size);

/// Reads the control points of an FBX file, text or binary, and of a Collada file that the bytes are. Ends the process
/// (abort) when a corner is out of range, or the polygons have other corners than there are. True when either has some.
bool fuzzControlMeshes(const std::uint8_t* data, std::size_t size);

/// Unpacks an answer of the importer's process: the bytes after "r"; after "e", a sound answer changed at places of two
/// bytes each, to a third. Ends the process (abort) when one that is accepted packs to other bytes, or has an index out
/// of range. True when accepted.
bool fuzzCharacterAnswer(const std::uint8_t* data, std::size_t size);
