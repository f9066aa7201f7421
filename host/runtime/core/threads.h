// SPDX-License-Identifier: Apache-2.0
// The thread tags of the API, asserted in debug builds.
#pragma once

namespace OpenQuarn {

/// Makes the calling thread the main one.
void setMainThread();
bool isMainThread();

/// A violated tag ends a debug build with a sentence that names the function; release builds check nothing.
#ifdef NDEBUG
inline void requireMain(const char*) {}
inline void requireEval(const char*) {}
#else
/// [main]: the main thread, outside of an evaluation.
void requireMain(const char* function);
/// [eval]: the main thread, or a thread inside an evaluation.
void requireEval(const char* function);
#endif

} // namespace OpenQuarn
