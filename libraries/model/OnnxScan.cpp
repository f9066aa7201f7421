// SPDX-License-Identifier: Apache-2.0
#include "OnnxScan.h"

#include "Wire.h"
#include "storage/Json.h"

#include <algorithm>
#include <fstream>
#include <limits>
#include <map>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

namespace neuralWarp {
namespace {

// what a file may ask for: decision 0118
constexpr std::uint64_t unbounded = std::numeric_limits<std::uint64_t>::max();
constexpr int deepest = 100; // as deep as the runtime reads
constexpr std::uint64_t longestName = Wire::longestText;

/// The kinds of message of onnx.proto that are looked into; field numbers are those of that file.
enum class Kind { none, model, graph, node, attribute, tensor, sparseTensor, function, training, valueInfo, entry };

Kind kindOfField(Kind message, std::uint64_t field) {
    switch (message) {
    case Kind::model:
        return field == 7    ? Kind::graph
               : field == 14 ? Kind::entry
               : field == 20 ? Kind::training
               : field == 25 ? Kind::function
                             : Kind::none;
    case Kind::training:
        return field == 1 || field == 2 ? Kind::graph : Kind::none;
    case Kind::function:
        return field == 7 ? Kind::node : field == 11 ? Kind::attribute : Kind::none;
    case Kind::graph:
        return field == 1    ? Kind::node
               : field == 5  ? Kind::tensor
               : field == 11 ? Kind::valueInfo
               : field == 15 ? Kind::sparseTensor
                             : Kind::none;
    case Kind::node:
        return field == 5 ? Kind::attribute : Kind::none;
    case Kind::attribute:
        return field == 5 || field == 10    ? Kind::tensor
               : field == 6 || field == 11  ? Kind::graph
               : field == 22 || field == 23 ? Kind::sparseTensor
                                            : Kind::none;
    case Kind::sparseTensor:
        return field == 1 || field == 2 ? Kind::tensor : Kind::none;
    default:
        return Kind::none;
    }
}

constexpr const char* configKey = "ort_config";

[[noreturn]] void refuseConfig(const std::string& reason) {
    throw std::runtime_error(std::string("its metadata entry \"") + configKey + "\" " + reason);
}

void checkThreadCount(const std::string& name, const storage::JsonValue& value) {
    if (name != "intra_op_num_threads" && name != "inter_op_num_threads")
        refuseConfig("sets \"" + name + "\", and may only set numbers of threads");
    const unsigned cores = std::max(std::thread::hardware_concurrency(), 1U);
    if (!value.IsUint() || value.GetUint() < 1 || value.GetUint() > cores)
        refuseConfig("must give a whole number from 1 to " + std::to_string(cores) + ", the machine's cores, as \"" +
                     name + "\"");
}

/// Where the environment says so the runtime takes session options from this entry, and a stranger's may write files or
/// start any number of threads (decision 0060). Every member counts: of repeated ones another may be taken than ours.
void checkConfig(const std::string& text) {
    storage::JsonDocument document;
    try {
        document = storage::parseJson(text, storage::jsonRules::networkOptions);
    } catch (const storage::JsonError& error) {
        refuseConfig(std::string("is no JSON: ") + error.what());
    }
    if (!document.IsObject() || document.MemberCount() != 1 ||
        storage::viewOf(document.MemberBegin()->name) != "session_options" || !document.MemberBegin()->value.IsObject())
        refuseConfig("is no object of \"session_options\" alone");
    for (const auto& option : document.MemberBegin()->value.GetObject())
        checkThreadCount(std::string(storage::viewOf(option.name)), option.value);
}

/// What is remembered of the message that is being read, for those in which it matters.
struct Seen {
    std::string name;                 ///< of a tensor or a value; the operator of a node
    std::vector<std::string> inputs;  ///< of a node; the keys of a metadata entry
    std::vector<std::string> outputs; ///< of a node; the values of a metadata entry
    std::uint64_t bound = 0;          ///< largest integer in a tensor, or in the attributes of a node
    bool hasInteger = false;
    void take(std::uint64_t value) {
        bound = std::max(bound, value);
        hasInteger = true;
    }
};

class Scan {
public:
    explicit Scan(Wire& wire)
        : wire_(wire) {}

    void run() {
        Seen ignored;
        message(Kind::model, wire_.size(), 0, ignored);
        checkLoops();
    }

private:
    void message(Kind kind, std::uint64_t end, int depth, Seen& seen) {
        if (depth > deepest)
            throw std::runtime_error("its parts are nested too deep");
        while (wire_.position() < end)
            field(kind, end, depth, seen);
        if (wire_.position() != end)
            Wire::throwTruncated();
    }

    void field(Kind kind, std::uint64_t end, int depth, Seen& seen) {
        const auto [number, form, value] = wire_.field(end);
        if (form == Wire::Form::varint)
            return integer(kind, number, value, seen);
        if (form != Wire::Form::bytes)
            return;
        if (const Kind inner = kindOfField(kind, number); inner != Kind::none)
            return part(kind, inner, wire_.position() + value, depth, seen);
        bytes(kind, number, value, seen);
    }

    void integer(Kind kind, std::uint64_t number, std::uint64_t value, Seen& seen) {
        if (kind == Kind::tensor && number == 14 && value != 0)
            throw std::runtime_error("data of the network lie in another file, which is not read");
        if ((kind == Kind::tensor && number == 7) || (kind == Kind::attribute && number == 3))
            seen.take(value);
    }

    void bytes(Kind kind, std::uint64_t number, std::uint64_t length, Seen& seen) {
        if (kind == Kind::node && number == 1)
            seen.inputs.push_back(wire_.text(length));
        else if (kind == Kind::node && number == 2)
            seen.outputs.push_back(wire_.text(length));
        else if ((kind == Kind::node && number == 4) || (kind == Kind::tensor && number == 8) ||
                 (kind == Kind::valueInfo && number == 1))
            name(kind, length, seen);
        else if (kind == Kind::function && number == 4)
            define(wire_.text(length), unbounded);
        else if (kind == Kind::entry && (number == 1 || number == 2))
            entryText(number == 1 ? seen.inputs : seen.outputs, length);
        else if (kind == Kind::tensor && (number == 7 || number == 9))
            integers(number, length, seen);
        else
            wire_.skip(length);
    }

    // one byte too many stands for a text that is too long
    void entryText(std::vector<std::string>& texts, std::uint64_t length) {
        texts.push_back(wire_.text(length));
        if (length > longestName)
            texts.back() += '\0';
    }

    void entry(const Seen& entry) {
        if (std::find(entry.inputs.begin(), entry.inputs.end(), configKey) == entry.inputs.end())
            return;
        if (entry.inputs.size() != 1 || entry.outputs.size() != 1)
            refuseConfig("has not one key and one value");
        if (entry.outputs.front().size() > longestName)
            refuseConfig("is longer than " + std::to_string(longestName) + " bytes");
        checkConfig(entry.outputs.front());
        if (hasConfig_)
            refuseConfig("is there more than once");
        hasConfig_ = true;
    }

    void name(Kind kind, std::uint64_t length, Seen& seen) {
        const std::string text = wire_.text(length);
        // of a repeated operator the last counts for the runtime: a loop among them is one here
        if (kind != Kind::node || seen.name != "Loop")
            seen.name = text;
    }

    // a tensor of more than one value is no number of rounds
    void integers(std::uint64_t number, std::uint64_t length, Seen& seen) {
        if (length > 10)
            seen.take(unbounded);
        if (length > 10 || (number == 9 && length != 8))
            return wire_.skip(length);
        const std::uint64_t end = wire_.position() + length;
        while (wire_.position() < end)
            seen.take(number == 9 ? wire_.fixed(8) : wire_.varint());
    }

    void part(Kind kind, Kind inner, std::uint64_t end, int depth, Seen& seen) {
        Seen within;
        message(inner, end, depth + 1, within);
        if (inner == Kind::node)
            return node(within);
        if (inner == Kind::entry)
            return entry(within);
        if (kind == Kind::graph && inner == Kind::tensor)
            return define(within.name, within.hasInteger ? within.bound : unbounded);
        if (kind == Kind::graph && inner == Kind::valueInfo && depth > 1) // those of the whole network are its controls
            return define(within.name, unbounded);
        if (within.hasInteger && (inner == Kind::attribute || inner == Kind::tensor))
            seen.take(within.bound);
    }

    void node(const Seen& node) {
        const bool isConstant = node.name == "Constant" && node.hasInteger;
        for (const std::string& output : node.outputs)
            define(output, isConstant ? node.bound : unbounded);
        if (node.name == "Loop")
            loops_.push_back(node.inputs.empty() ? std::string() : node.inputs.front());
    }

    // names count wherever they stand: one that means two things is taken for the larger
    void define(const std::string& name, std::uint64_t bound) {
        const auto [at, isNew] = bounds_.emplace(name, bound);
        if (!isNew)
            at->second = std::max(at->second, bound);
    }

    void checkLoops() const {
        std::uint64_t rounds = 1;
        for (const std::string& name : loops_) {
            const auto found = bounds_.find(name);
            if (name.empty() || found == bounds_.end() || found->second == unbounded)
                throw std::runtime_error("it has a Loop whose number of rounds is not a constant: it need not end");
            const std::uint64_t bound = std::max<std::uint64_t>(found->second, 1);
            if (bound > loopRoundLimit / rounds)
                throw std::runtime_error("its loops make more than " + std::to_string(loopRoundLimit) + " rounds");
            rounds *= bound;
        }
    }

    Wire& wire_;
    std::map<std::string, std::uint64_t> bounds_; ///< largest integer that a name can stand for
    std::vector<std::string> loops_;              ///< the names of their numbers of rounds
    bool hasConfig_ = false;                      ///< there was an entry with session options
};

} // namespace

void scanOnnx(std::streambuf& source, std::uint64_t size) {
    Wire wire(source, size);
    Scan(wire).run();
}

void scanOnnxFile(const std::filesystem::path& path) {
    std::filebuf file;
    if (!file.open(path, std::ios::in | std::ios::binary))
        throw std::runtime_error("the file cannot be opened");
    scanOnnx(file, std::filesystem::file_size(path));
}

} // namespace neuralWarp
