// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <exception>
#include <string>

/// What the body throws says; "" when it throws nothing.
template <class Body>
std::string failureOf(Body&& body) {
    try {
        body();
    } catch (const std::exception& error) {
        return error.what();
    }
    return "";
}
