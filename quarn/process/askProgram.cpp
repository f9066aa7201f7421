// SPDX-License-Identifier: Apache-2.0
#include "quarn/process/askProgram.h"

#include "storage/Descriptor.h"

#include <sys/mman.h>

namespace quarn {

std::string ProgramAnswer::firstLine() const {
    return text.substr(0, text.find('\n'));
}

std::string ProgramAnswer::lastLine() const {
    const std::size_t last = text.find_last_not_of("\n\r ");
    if (last == std::string::npos)
        return {};
    const std::size_t before = text.rfind('\n', last);
    const std::size_t begin = before == std::string::npos ? 0 : before + 1;
    return text.substr(begin, last + 1 - begin);
}

ProgramAnswer askProgram(ProgramCall call, const std::function<void()>& meanwhile) {
    constexpr std::size_t most = 65536;
    const storage::Descriptor file(::memfd_create("answer", MFD_CLOEXEC));
    call.log = file.number();
    call.output = -1;
    ProgramAnswer answer;
    answer.end = runProgram(call, meanwhile);
    std::vector<std::byte> bytes(most);
    const std::ptrdiff_t count = storage::readAt(file.number(), 0, bytes);
    for (std::ptrdiff_t i = 0; i < count; ++i)
        answer.text += static_cast<char>(bytes[static_cast<std::size_t>(i)]);
    return answer;
}

std::filesystem::path thisProgram() {
    return std::filesystem::read_symlink("/proc/self/exe");
}

} // namespace quarn
