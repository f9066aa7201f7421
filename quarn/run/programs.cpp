// SPDX-License-Identifier: Apache-2.0
#include "quarn/run/programs.h"

#include "quarn/process/askProgram.h"

#include <cstdlib>

#include <unistd.h>

namespace quarn {
namespace {

namespace fs = std::filesystem;

std::string variable(const char* name) {
    const char* value = std::getenv(name);
    return value == nullptr ? "" : value;
}

ProgramAnswer ask(Words words, const std::map<std::string, std::string>& environment) {
    constexpr std::chrono::seconds patience{60};
    ProgramCall call;
    call.words = std::move(words);
    call.environment = environment;
    call.timeout = patience;
    return askProgram(std::move(call));
}

// the folder in which the package lies, when this program was built there: build/PRESET/quarn/quarn
fs::path checkout() {
    const fs::path root = thisProgram().parent_path().parent_path().parent_path().parent_path();
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
        std::string why;
        try {
            const ProgramAnswer said = ask({python, "-c", findModules}, {});
            if (said.end.isGood())
                return python;
            why = said.firstLine();
        } catch (const TimedOut&) {
            why = "gave no answer";
        } catch (const std::runtime_error&) {
            why = "cannot be started";
        }
        reasons += python + " " + why + "; ";
    }
    throw std::runtime_error(
        "no Python for the trainer: " + reasons + "install (Debian) python3-torch, " +
        "python3-onnx, python3-scipy, python3-tqdm, python3-matplotlib, python3-xxhash, or set NW_PYTHON");
}

FoundProgram found(Words words, std::map<std::string, std::string> environment) {
    environment["QUARN"] = thisProgram().string();
    FoundProgram program{words, std::move(environment), {}};
    words.emplace_back("--version");
    const ProgramAnswer said = ask(words, program.environment);
    if (!said.end.isGood())
        throw std::runtime_error("the trainer, " + words.front() + ", does not start: " + said.firstLine());
    program.version = said.firstLine();
    return program;
}

} // namespace

FoundProgram thisQuarn() {
    return {{thisProgram().string()}, {}, "quarn " QUARN_VERSION};
}

FoundProgram findTrainer() {
    const char* name = "neuralwarp-train";
    if (const std::string wanted = variable("NEURALWARP_TRAINER"); !wanted.empty())
        return found({wanted}, {});
    if (const fs::path beside = thisProgram().parent_path() / name; ::access(beside.c_str(), X_OK) == 0)
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
