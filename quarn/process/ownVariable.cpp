// SPDX-License-Identifier: Apache-2.0
#include "quarn/process/ownVariable.h"

#include <cerrno>
#include <cstdlib>
#include <set>
#include <system_error>

namespace quarn {
namespace {

std::set<std::string>& ownVariables() {
    static std::set<std::string> names;
    return names;
}

} // namespace

void setOwnVariable(const std::string& name, const std::string& value) {
    if (std::getenv(name.c_str()) != nullptr) // NOLINT(concurrency-mt-unsafe): there is no other thread
        return;
    if (::setenv(name.c_str(), value.c_str(), 0) != 0) // NOLINT(concurrency-mt-unsafe)
        throw std::system_error(errno, std::generic_category(), name + " cannot be set");
    ownVariables().insert(name);
}

bool isOwnVariable(const std::string& name) {
    return ownVariables().count(name) > 0;
}

} // namespace quarn
