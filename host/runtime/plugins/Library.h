// SPDX-License-Identifier: Apache-2.0
// A plug-in's file, opened.
#pragma once

#include <string>

namespace OpenQuarn {

class Library {
public:
    /// `path` absolute. Throws std::runtime_error with the loader's reason.
    explicit Library(std::string path);
    ~Library(); ///< closes it
    /// False when it stays mapped nevertheless.
    bool close();
    Library(const Library&) = delete;
    Library& operator=(const Library&) = delete;

    /// Throws std::runtime_error when the library itself has no such symbol.
    void* symbol(const char* name) const;
    /// True for the address of something in the library.
    bool contains(const void* address) const;
    /// Leaves the library mapped until the end of the process: something that cannot be taken away still points in.
    void keep() { handle_ = nullptr; }

private:
    std::string path_;
    void* handle_;
    void* record_ = nullptr; // the loader's, of this library
};

/// Throws std::runtime_error when a plug-in built for this version of the H-API cannot work with this host.
/// `version` the eight characters that the plug-in exports. Returns the version as a text.
std::string checkedApiVersion(const char* version);

/// True when a host of this version serves a plug-in that needs `required`, as "1.0".
bool servesApiVersion(const std::string& required);
/// The version of this host.
std::string hostApiVersion();

} // namespace OpenQuarn
