// SPDX-License-Identifier: Apache-2.0
#include "gpu/programs.h"

#include "gpu/Device.h"
#include "gpu/failure.h"
#include "gpu/kernelSource.h"

#include <algorithm>
#include <atomic>
#include <filesystem>
#include <map>
#include <mutex>
#include <tuple>
#include <utility>
#include <vector>

namespace OpenQuarn {
namespace {

struct Key {
    std::string file; // absolute
    std::vector<std::string> folders;
    bool hasDoubles;
    const Device* device; // which the program keeps
    bool operator<(const Key& other) const {
        return std::tie(file, folders, hasDoubles, device) <
               std::tie(other.file, other.folders, other.hasDoubles, other.device);
    }
};

// A program, or the text of its compiler: one of them is there.
struct Entry {
    std::vector<FileStamp> stamps;
    std::shared_ptr<Device> device; // a device that comes later has another address
    std::shared_ptr<const Program> program;
    std::string failure;
    std::uint64_t look = 0; ///< the last in which its files were looked at
};

struct Programs {
    std::mutex mutex;
    std::map<Key, Entry> entries;
};

// never destroyed, as the device is not
Programs& programs() {
    static Programs& thePrograms = *new Programs;
    return thePrograms;
}

std::atomic<bool> withoutDoubles = false;

std::atomic<std::uint64_t> lastLook = 0;
thread_local std::uint64_t thisLook = 0; ///< 0: each time is another look

bool isCurrent(const Entry& entry) {
    return std::all_of(entry.stamps.begin(), entry.stamps.end(),
                       [](const FileStamp& stamp) { return stampOf(stamp.path) == stamp; });
}

std::string absolutePath(const std::string& path) {
    if (path.starts_with('/'))
        return path;
    return std::filesystem::absolute(path).string();
}

Key keyOf(const std::string& file, const HStringArray* includes, const Device& device) {
    Key key{absolutePath(file), {}, device.hasDoubles && !withoutDoubles, &device};
    if (includes) {
        key.folders.reserve(includes->length());
        for (const HString& folder : *includes)
            key.folders.push_back(absolutePath(folder.asStdString()));
    }
    return key;
}

std::string optionsFor(const Key& key, const Device& device) {
    std::string options = "-cl-std=CL1.2";
    if (!key.hasDoubles)
        options += " -D NW_WITHOUT_DOUBLES";
    if (device.roundsCorrectly)
        options += " -cl-fp32-correctly-rounded-divide-sqrt";
    return options;
}

std::string buildLog(const Program& program) {
    constexpr std::size_t longest = 4000;
    std::size_t size = 0;
    const auto ask = [&](std::size_t room, char* to, std::size_t* needed) {
        return noteFailure(
            clGetProgramBuildInfo(program.id, program.device->id, CL_PROGRAM_BUILD_LOG, room, to, needed),
            "clGetProgramBuildInfo");
    };
    if (ask(0, nullptr, &size) != CL_SUCCESS)
        return {};
    std::string log(size, '\0');
    if (size == 0 || ask(size, log.data(), nullptr) != CL_SUCCESS)
        return {};
    log.resize(std::min({log.find('\0'), size, longest}));
    while (!log.empty() && log.back() == '\n')
        log.pop_back();
    return log;
}

// null, with the reason noted, when the program could not even be made
std::shared_ptr<Program> makeProgram(std::shared_ptr<Device> device, const std::string& text) {
    auto program = std::make_shared<Program>();
    program->device = std::move(device);
    const char* source = text.c_str();
    const std::size_t length = text.size();
    cl_int status = CL_SUCCESS;
    program->id = clCreateProgramWithSource(program->device->context, 1, &source, &length, &status);
    return noteFailure(status, "clCreateProgramWithSource") == CL_SUCCESS ? program : nullptr;
}

// Neither a program nor a text: something failed that may not fail next time, and is noted.
Entry compile(const Key& key, const std::shared_ptr<Device>& device) {
    KernelSource source = readKernelSource(key.file, key.folders);
    Entry entry{std::move(source.stamps), device, nullptr, {}, thisLook};
    const auto program = makeProgram(device, source.text);
    if (!program)
        return entry;
    const cl_int status =
        clBuildProgram(program->id, 1, &device->id, optionsFor(key, *device).c_str(), nullptr, nullptr);
    if (status == CL_SUCCESS)
        entry.program = program;
    else if (status == CL_BUILD_PROGRAM_FAILURE)
        entry.failure = "clBuildProgram: CL_BUILD_PROGRAM_FAILURE (-11), " + key.file + ":\n" + buildLog(*program);
    else
        noteFailure(status, "clBuildProgram", key.file);
    return entry;
}

const Entry* findCurrent(const Key& key) {
    const auto found = programs().entries.find(key);
    if (found == programs().entries.end())
        return nullptr;
    Entry& entry = found->second;
    if ((thisLook != 0 && entry.look == thisLook) || isCurrent(entry)) {
        entry.look = thisLook;
        return &entry;
    }
    programs().entries.erase(found);
    return nullptr;
}

} // namespace

OneLook::OneLook() noexcept
    : before_(std::exchange(thisLook, ++lastLook)) {}

OneLook::~OneLook() {
    thisLook = before_;
}

Program::~Program() {
    if (id)
        noteFailure(clReleaseProgram(id), "clReleaseProgram");
}

std::shared_ptr<const Program> loadProgram(const std::string& file, const HStringArray* includes) {
    const auto device = currentDevice();
    if (!device)
        return nullptr;
    const Key key = keyOf(file, includes, *device);
    const std::scoped_lock lock(programs().mutex);
    const Entry* entry = findCurrent(key);
    if (!entry) {
        Entry made = compile(key, device);
        if (!made.program && made.failure.empty())
            return nullptr;
        entry = &programs().entries.insert_or_assign(key, std::move(made)).first->second;
    }
    if (!entry->program)
        noteFailure(entry->failure);
    return entry->program;
}

void forgetPrograms() {
    std::map<Key, Entry> forgotten; // released without the lock
    const std::scoped_lock lock(programs().mutex);
    forgotten.swap(programs().entries);
}

void compileWithoutDoubles(bool without) {
    withoutDoubles = without;
}

} // namespace OpenQuarn
