// SPDX-License-Identifier: Apache-2.0
#include "quarn/run/programs.h"

#include "quarn/process/runProgram.h"
#include "storage/Descriptor.h"

#include <array>
#include <cstdlib>

#include <sys/mman.h>
#include <unistd.h>

namespace quarn {
namespace {

namespace fs = std::filesystem;

fs::path self() {
    return fs::read_symlink("/proc/self/exe");
}

std::string variable(const char* name) {
    const char* value = std::getenv(name);
    return value == nullptr ? "" : value;
}

/// What a program says in a line, and whether it ended well.
struct Said {
    bool isGood = false;
    std::string line;
};

Said ask(Words words, const std::map<std::string, std::string>& environment) {
    const storage::Descriptor answer(::memfd_create("answer", MFD_CLOEXEC));
    ProgramCall call;
    call.words = std::move(words);
    call.environment = environment;
    call.log = answer.number();
    constexpr std::chrono::seconds patience{60};
    call.timeout = patience;
    Said said;
    said.isGood = runProgram(call).isGood();
    std::array<std::byte, 4096> bytes{};
    const std::ptrdiff_t count = storage::readAt(answer.number(), 0, bytes);
    for (std::ptrdiff_t i = 0; i < count && bytes.at(static_cast<std::size_t>(i)) != std::byte{'\n'}; ++i)
        said.line += static_cast<char>(bytes.at(static_cast<std::size_t>(i)));
    return said;
}

// the folder in which the package lies, when this program was built there: build/PRESET/quarn/quarn
fs::path checkout() {
    const fs::path root = self().parent_path().parent_path().parent_path().parent_path();
    return fs::exists(root / "trainer" / "__main__.py") ? root : fs::path();
}

// finding modules is enough: importing them takes seconds
constexpr const char* findModules = "import sys, importlib.util as u\n"
                                    "names = 'numpy scipy torch onnx tqdm matplotlib xxhash'.split()\n"
                                    "missing = [n for n in names if u.find_spec(n) is None]\n"
                                    "print('lacks ' + ', '.join(missing)) if missing else None\n"
                                    "sys.exit(bool(missing))\n";

std::string findPython() {
    const std::string wanted = variable("NW_PYTHON");
    const Words candidates = wanted.empty() ? Words{"/usr/bin/python3", "python3"} : Words{wanted};
    std::string reasons;
    for (const std::string& python : candidates) {
        Said said;
        try {
            said = ask({python, "-c", findModules}, {});
        } catch (const TimedOut&) {
            said.line = "gave no answer";
        } catch (const std::runtime_error&) {
            said.line = "cannot be started";
        }
        if (said.isGood)
            return python;
        reasons += python + " " + said.line + "; ";
    }
    throw std::runtime_error(
        "no Python for the trainer: " + reasons + "install (Debian) python3-torch, " +
        "python3-onnx, python3-scipy, python3-tqdm, python3-matplotlib, python3-xxhash, or set NW_PYTHON");
}

FoundProgram found(Words words, std::map<std::string, std::string> environment) {
    environment["QUARN"] = self().string();
    FoundProgram program{words, std::move(environment), {}};
    words.emplace_back("--version");
    const Said said = ask(words, program.environment);
    if (!said.isGood)
        throw std::runtime_error("the trainer, " + words.front() + ", does not start: " + said.line);
    program.version = said.line;
    return program;
}

} // namespace

FoundProgram thisQuarn() {
    return {{self().string()}, {}, "quarn " QUARN_VERSION};
}

FoundProgram findTrainer() {
    const char* name = "neuralwarp-train";
    if (const std::string wanted = variable("NEURALWARP_TRAINER"); !wanted.empty())
        return found({wanted}, {});
    if (const fs::path beside = self().parent_path() / name; ::access(beside.c_str(), X_OK) == 0)
        return found({beside.string()}, {});
    if (const fs::path root = checkout(); !root.empty()) {
        const std::string more = variable("PYTHONPATH");
        return found({findPython(), "-m", "trainer"},
                     {{"PYTHONPATH", root.string() + (more.empty() ? "" : ":" + more)}});
    }
    try {
        return found({name}, {});
    } catch (const std::runtime_error& error) {
        throw std::runtime_error("there is no trainer: neither beside quarn nor on the PATH (" +
                                 std::string(error.what()) + "); NEURALWARP_TRAINER names another");
    }
}

} // namespace quarn
