// SPDX-License-Identifier: Apache-2.0
// bench_graph: whether the costs of the host's graph grow as they should. The yardstick of a row ("plain") is the same
// work in a small scene: the ratio of the times per unit should stay near 1. In the table a "vertex" is one node, one
// element or one evaluation.
#include "harness.h"
#include "options.h"

#include "openquarn/HDGModifier.h"
#include "openquarn/HFnAttribute.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HFnPlugin.h"
#include "openquarn/HNodeClass.h"
#include "openquarn/HPxNode.h"
#include "openquarn_app/Evaluation.h"
#include "openquarn_app/Plugins.h"
#include "openquarn_app/SceneFile.h"
#include "openquarn_app/Session.h"

#include <exception>
#include <functional>
#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

namespace {

using bench::Phase;

void check(const HStatus& status) {
    if (status.error())
        throw std::runtime_error(status.errorString().asStdString());
}

/// out = in + the number of elements of ins; the latter alone, and `in` unread, while `skip` is on.
class BenchNode : public HPxNode {
public:
    static HPxNode* creator() { return new BenchNode; }

    static HStatus initialize() {
        in = HFnNumericAttribute().create("in", "in", HFnNumericData::kDouble);
        ins = HFnNumericAttribute().create("ins", "ins", HFnNumericData::kDouble);
        HFnAttribute(ins).setArray(true);
        skip = HFnNumericAttribute().create("skip", "sk", HFnNumericData::kBoolean);
        out = HFnNumericAttribute().create("out", "out", HFnNumericData::kDouble);
        HFnAttribute(out).setWritable(false);
        for (const HObject& attribute : {in, ins, skip, out})
            addAttribute(attribute);
        attributeAffects(in, out);
        attributeAffects(skip, out);
        return attributeAffects(ins, out);
    }

    HStatus compute(const HPlug& plug, HDataBlock& block) override {
        if (plug != out)
            return HStatus::kUnknownParameter;
        const double count = block.outputArrayValue(ins).elementCount();
        HDataHandle result = block.outputValue(out);
        result.set(block.inputValue(skip).asBool() ? count : block.inputValue(in).asDouble() + count);
        result.setClean();
        return HStatus::kSuccess;
    }

private:
    static inline HObject in, ins, skip, out;
};

constexpr unsigned typeId = 0x7e570101;

HStatus initializePlugin(HObject object) {
    return HFnPlugin(object).registerNode("benchNode", typeId, BenchNode::creator, BenchNode::initialize);
}
HStatus uninitializePlugin(HObject object) {
    return HFnPlugin(object).deregisterNode(typeId);
}

struct Chain {
    std::vector<HPlug> ins, outs;

    explicit Chain(std::size_t length, bool fromItsEnd = false) {
        for (std::size_t i = 0; i < length; ++i) {
            const HFnDependencyNode node(HFnDependencyNode().create("benchNode"));
            ins.push_back(node.findPlug("in"));
            outs.push_back(node.findPlug("out"));
        }
        HDGModifier modifier;
        for (std::size_t i = 1; i < length; ++i) {
            const std::size_t to = fromItsEnd ? length - i : i;
            check(modifier.connect(outs[to - 1], ins[to]));
        }
        check(modifier.doIt());
        check(OpenQuarn::evaluate(outs.back()));
    }
    ~Chain() {
        HDGModifier modifier;
        for (const HPlug& plug : outs)
            modifier.deleteNode(plug.node());
        modifier.doIt();
    }
    Chain(const Chain&) = delete;
    Chain& operator=(const Chain&) = delete;
};

/// `work` on a small and on a large thing, `count` units of it in the large one.
Phase growth(const std::string& name, const std::string& what, std::size_t count, std::function<void()> large,
             std::function<void()> small) {
    Phase phase{name, what, count};
    phase.parallel = false;
    phase.ours = std::move(large);
    phase.plain = std::move(small);
    return phase;
}

// the last node of a chain, whose own second input changed
std::function<void()> evaluateLast(const Chain& chain) {
    HPlug extra = HPlug(chain.outs.back().node(), HNodeClass("benchNode").attribute("ins")).elementByLogicalIndex(0);
    return [extra, out = chain.outs.back(), value = 0.0]() mutable {
        check(extra.setDouble(value += 1.0));
        check(OpenQuarn::evaluate(out));
    };
}

// the whole chain, `times` over, so that the small one does as much as the large one
std::function<void()> dirtyAndEvaluateAll(const Chain& chain, std::size_t times) {
    return [in = chain.ins.front(), out = chain.outs.back(), times, value = 0.0]() mutable {
        for (std::size_t i = 0; i < times; ++i) {
            check(in.setDouble(value += 1.0));
            check(OpenQuarn::evaluate(out));
        }
    };
}

std::function<void()> build(std::size_t length, std::size_t times, bool fromItsEnd) {
    return [=] {
        for (std::size_t i = 0; i < times; ++i)
            const Chain chain(length, fromItsEnd);
    };
}

// edits at the head of a chain that nobody reads
std::function<void()> editUnread(const Chain& chain, std::size_t times) {
    return [in = chain.ins.front(), times, value = 0.0]() mutable {
        for (std::size_t i = 0; i < times; ++i)
            check(in.setDouble(value += 1.0));
    };
}

// frames of a chain whose last node is evaluated and does not read its input, `times` over
std::function<void()> passUnread(const Chain& chain, std::size_t times) {
    HPlug skip = HFnDependencyNode(chain.outs.back().node()).findPlug("skip");
    return [skip, frames = dirtyAndEvaluateAll(chain, times)]() mutable {
        check(skip.setBool(true));
        frames();
        check(skip.setBool(false));
    };
}

enum class Order { ascending, descending, scattered };

// sets and reads back a fresh array of `size` elements, `times` over
std::function<void()> fillArray(std::size_t size, std::size_t times, Order order) {
    return [size, times, order] {
        for (std::size_t round = 0; round < times; ++round) {
            const HFnDependencyNode node(HFnDependencyNode().create("benchNode"));
            const HPlug array = node.findPlug("ins");
            for (std::size_t i = 0; i < size; ++i) {
                const std::size_t scattered = i * 7919 % size; // a prime that divides no size used here
                const std::size_t index = order == Order::ascending    ? i
                                          : order == Order::descending ? size - 1 - i
                                                                       : scattered;
                check(array.elementByLogicalIndex(static_cast<unsigned>(index)).setDouble(1.0));
            }
            for (std::size_t i = 0; i < size; ++i)
                if (array.elementByPhysicalIndex(static_cast<unsigned>(i)).asDouble() != 1.0)
                    throw std::runtime_error("an element was lost");
            HDGModifier modifier;
            modifier.deleteNode(node.object());
            check(modifier.doIt());
        }
    };
}

/// The text of a scene that is a chain of nodes, or one node with an array.
std::string sceneText(OpenQuarn::Session& session, std::size_t nodes, std::size_t elements) {
    session.newScene();
    std::string text;
    {
        const Chain chain(nodes);
        const HPlug array = HFnDependencyNode(chain.ins.front().node()).findPlug("ins");
        for (std::size_t i = 0; i < elements; ++i)
            check(array.elementByLogicalIndex(static_cast<unsigned>(3 * i))
                      .setDouble(1.0 / (1.0 + static_cast<double>(i))));
        if (const auto outcome = OpenQuarn::sceneToText(text); !outcome)
            throw std::runtime_error(outcome.error);
    }
    return text;
}

// reads a scene and writes it again, `times` over
std::function<void()> readAndWrite(std::string text, std::size_t times) {
    return [text = std::move(text), times] {
        std::string again;
        for (std::size_t i = 0; i < times; ++i) {
            if (!OpenQuarn::sceneFromText(text, "bench") || !OpenQuarn::sceneToText(again) || again != text)
                throw std::runtime_error("the scene did not come back");
        }
    };
}

void measureFiles(OpenQuarn::Session& session, const bench::Options& options, bench::Report& report) {
    const std::vector<Phase> phases = {
        growth("read and write", "10 000 nodes", 10000, readAndWrite(sceneText(session, 10000, 0), 1),
               readAndWrite(sceneText(session, 1000, 0), 10)),
        growth("read and write array", "100 000", 100000, readAndWrite(sceneText(session, 1, 100000), 1),
               readAndWrite(sceneText(session, 1, 10000), 10)),
    };
    for (const Phase& phase : phases)
        if (phase.name.rfind(options.only, 0) == 0)
            report.add(bench::measure(phase, 1, options.seconds));
}

void runAll(const bench::Options& options, bench::Report& report) {
    const Chain small(100);
    const Chain medium(1000);
    const Chain large(10000);
    const std::vector<Phase> phases = {
        growth("evaluate last", "10 000 nodes", 1, evaluateLast(large), evaluateLast(small)),
        growth("dirty and evaluate all", "10 000 nodes", 10000, dirtyAndEvaluateAll(large, 1),
               dirtyAndEvaluateAll(medium, 10)),
        growth("unread, 10 000 edits", "10 000 nodes", 10000, editUnread(large, 10000), editUnread(small, 10000)),
        growth("unread, edit and evaluate", "10 000 nodes", 10000, passUnread(large, 1), passUnread(medium, 10)),
        growth("build from its start", "10 000 nodes", 10000, build(10000, 1, false), build(1000, 10, false)),
        growth("build from its end", "2 000 nodes", 2000, build(2000, 1, true), build(200, 10, true)),
        growth("array, ascending", "100 000", 100000, fillArray(100000, 1, Order::ascending),
               fillArray(1000, 100, Order::ascending)),
        growth("array, descending", "100 000", 100000, fillArray(100000, 1, Order::descending),
               fillArray(1000, 100, Order::descending)),
        growth("array, scattered", "100 000", 100000, fillArray(100000, 1, Order::scattered),
               fillArray(1000, 100, Order::scattered)),
    };
    for (const Phase& phase : phases)
        if (phase.name.rfind(options.only, 0) == 0)
            report.add(bench::measure(phase, 1, options.seconds));
}

} // namespace

int main(int argc, char** argv) {
    const auto options = bench::readOptions(argc, argv);
    if (!options)
        return 2;
    try {
        OpenQuarn::Session session;
        OpenQuarn::addPlugin("bench", initializePlugin, uninitializePlugin);
        bench::Report report(options->csv.get());
        report.header();
        runAll(*options, report);
        measureFiles(session, *options, report);
        bench::Report::legend("the same number of units in a small scene");
        std::printf("CSV: %s\n", options->csvPath.c_str());
        return 0;
    } catch (const std::exception& error) {
        std::fprintf(stderr, "bench_graph: %s\n", error.what());
        return 1;
    }
}
