// SPDX-License-Identifier: Apache-2.0
#include "plugins/Library.h"

#include "openquarn/HApi.h"

#include <oneapi/tbb/global_control.h>

#include <algorithm>
#include <charconv>
#include <dlfcn.h>
#include <optional>
#include <stdexcept>
#include <utility>

namespace OpenQuarn {
namespace {

constexpr char hostVersion[] = OPENQUARN_API_VERSION;
constexpr std::size_t versionLength = sizeof hostVersion;

std::string loaderError() {
    const char* text = dlerror();
    return text ? text : "the loader gives no reason";
}

// A parallel loop ends for its caller while a worker may still be on its way out of the loop's code, which lies in the
// library: nobody may be there when it goes. The workers come back with the next loop.
void sendWorkersHome() {
    oneapi::tbb::task_scheduler_handle workers{oneapi::tbb::attach{}};
    oneapi::tbb::finalize(workers, std::nothrow);
}

// the loader's record of the library that an address lies in
const void* recordOf(const void* address) {
    Dl_info info;
    void* record = nullptr;
    return dladdr1(address, &info, &record, RTLD_DL_LINKMAP) != 0 ? record : nullptr;
}

// "MAJOR.MINOR", both decimal
std::optional<std::pair<unsigned, unsigned>> parsedVersion(const std::string& text) {
    std::pair<unsigned, unsigned> numbers;
    const char* const end = text.data() + text.size();
    const auto [dot, majorError] = std::from_chars(text.data(), end, numbers.first);
    if (majorError != std::errc() || dot == end || *dot != '.')
        return std::nullopt;
    const auto [rest, minorError] = std::from_chars(dot + 1, end, numbers.second);
    if (minorError != std::errc() || rest != end)
        return std::nullopt;
    return numbers;
}

std::string printable(std::string text) {
    std::replace_if(
        text.begin(), text.end(), [](char c) { return c < ' ' || c > '~'; }, '?');
    return text;
}

} // namespace

Library::Library(std::string path)
    : path_(std::move(path))
    , handle_(dlopen(path_.c_str(), RTLD_NOW | RTLD_LOCAL)) {
    if (!handle_)
        throw std::runtime_error("it cannot be opened as a library: " + loaderError());
    dlinfo(handle_, RTLD_DI_LINKMAP, &record_);
}

Library::~Library() {
    close();
}

bool Library::close() {
    if (!handle_)
        return true;
    sendWorkersHome();
    dlclose(std::exchange(handle_, nullptr));
    void* const present = dlopen(path_.c_str(), RTLD_NOW | RTLD_NOLOAD);
    if (present)
        dlclose(present);
    return !present;
}

void* Library::symbol(const char* name) const {
    void* const address = dlsym(handle_, name);
    // one of a library that this one depends on is not meant
    if (!address || !contains(address))
        throw std::runtime_error("it has no symbol '" + std::string(name) + "'");
    return address;
}

bool Library::contains(const void* address) const {
    return address && record_ == recordOf(address);
}

std::string hostApiVersion() {
    return {hostVersion, std::find(hostVersion, hostVersion + versionLength, '\0')};
}

bool servesApiVersion(const std::string& required) {
    const auto wanted = parsedVersion(required);
    const auto present = parsedVersion(hostApiVersion());
    return wanted && present && wanted->first == present->first && wanted->second <= present->second;
}

// before anything of the plug-in runs (decision 0043)
std::string checkedApiVersion(const char* version) {
    std::string text(version, std::find(version, version + versionLength, '\0'));
    if (!servesApiVersion(text))
        throw std::runtime_error("it was built for version '" + printable(text) + "' of the H-API, and this host has " +
                                 hostApiVersion());
    return text;
}

} // namespace OpenQuarn
