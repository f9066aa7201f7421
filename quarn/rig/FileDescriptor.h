// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <utility>

#include <unistd.h>

namespace rig {

/// An open file of the system, closed with its owner. [any]
class FileDescriptor {
public:
    /// `number` from open(); negative for none.
    explicit FileDescriptor(int number)
        : number_(number) {}
    ~FileDescriptor() { close(); }
    FileDescriptor(const FileDescriptor&) = delete;
    FileDescriptor& operator=(const FileDescriptor&) = delete;

    int number() const { return number_; }
    bool isOpen() const { return number_ >= 0; }
    /// False, with errno, when the system has an error of before to tell; closed all the same.
    bool close() { return !isOpen() || ::close(std::exchange(number_, -1)) == 0; }

private:
    int number_;
};

} // namespace rig
