// SPDX-License-Identifier: Apache-2.0
#include "OnDevice.h"

#include "gpu/programs.h"

#include <gmock/gmock.h>

#include <array>
#include <functional>
#include <numeric>
#include <thread>
#include <utility>

using namespace OpenQuarn;
using testing::AllOf;
using testing::HasSubstr;

namespace {

class GpuKernels : public OnDevice {
protected:
    // Runs `kernel` of a file, which writes one int; -1 when that fails.
    int answerOf(const HString& file, const HStringArray* folders = nullptr, const char* kernel = "answer") {
        HOpenCLKernelInfo info;
        HOpenCLBuffer buffer;
        if (!info.loadOrUpdate(file, kernel, 1, folders) || buffer.ensureBufferSize(sizeof(int)) != CL_SUCCESS)
            return -1;
        cl_int status = CL_SUCCESS;
        info.setKernelArgBuffer(0, buffer, status);
        if (status != CL_SUCCESS || info.enqueueKernel({}, nullptr) != CL_SUCCESS)
            return -1;
        return contents<int>(buffer, 1).front();
    }
    HString writeAnswer(const std::string& name, const std::string& before, const std::string& value) {
        return write(name, before + "\n__kernel void answer(__global int* to) { if (get_global_id(0) == 0) to[0] = " +
                               value + "; }\n");
    }
};

TEST_F(GpuKernels, RunOnEveryIndexOnceWhateverTheirNumber) {
    const HString file = write("count.cl", countKernel);
    HOpenCLKernelInfo kernel;
    EXPECT_FALSE(kernel.isLoaded());
    for (const std::size_t items : {0U, 1U, 63U, 64U, 65U, 4999U, 99991U}) {
        SCOPED_TRACE(items);
        std::vector<int> expected(items + 300, -1); // more than there are indices, which stay
        HOpenCLBuffer buffer;
        HOpenCLBuffer add;
        ASSERT_EQ(upload(expected, buffer), CL_SUCCESS);
        ASSERT_EQ(upload<int>({7}, add), CL_SUCCESS);
        std::iota(expected.begin(), expected.end() - 300, 7);

        ASSERT_TRUE(kernel.loadOrUpdate(file, "count", items));
        EXPECT_EQ(kernel.workItems(), items);
        cl_int status = CL_SUCCESS;
        kernel.setKernelArgBuffer(0, buffer, status);
        kernel.setKernelArgBuffer(1, add, status);
        ASSERT_EQ(status, CL_SUCCESS);
        HOpenCLEvent done;
        ASSERT_EQ(kernel.enqueueKernel({buffer.bufferReadyEvent(), done}, &done), CL_SUCCESS);
        ASSERT_FALSE(done.isNull());
        EXPECT_EQ(contents<int>(buffer, items + 300), expected);
    }
    EXPECT_EQ(Gpu::counts().launches.at("count"), 6U) << "one each, and none without an index";
    kernel.reset();
    EXPECT_FALSE(kernel.isLoaded());
    EXPECT_EQ(kernel.enqueueKernel({}, nullptr), CL_INVALID_KERNEL);
    EXPECT_EQ(takeFailure(), "clEnqueueNDRangeKernel: CL_INVALID_KERNEL (-48), no kernel is loaded");
}

TEST_F(GpuKernels, TakeNullBuffersAndKeepTheFirstFailure) {
    const HString file = write("null.cl", "__kernel void isNull(__global int* to, __global int* a, __global int* b) {\n"
                                          "    if (get_global_id(0) == 0) to[0] = (a ? 0 : 1) + (b ? 0 : 2);\n}\n");
    HOpenCLKernelInfo kernel;
    ASSERT_TRUE(kernel.loadOrUpdate(file, "isNull", 1));
    HOpenCLBuffer to;
    ASSERT_EQ(upload<int>({0}, to), CL_SUCCESS);
    const struct {
        HOpenCLBuffer a;
        bool isValid;
        int expected;
    } cases[] = {{to, true, 2}, {to, false, 3}, {{}, true, 3}};
    cl_mem null = nullptr;
    for (const auto& arguments : cases) {
        cl_int status = CL_SUCCESS;
        kernel.setKernelArgBuffer(0, to, status);
        kernel.setKernelArgBuffer(1, arguments.a, status, arguments.isValid);
        HOpenCLUtils::setKernelArg(kernel, 2, sizeof(cl_mem), &null, status);
        ASSERT_EQ(status, CL_SUCCESS);
        ASSERT_EQ(kernel.enqueueKernel({}, nullptr), CL_SUCCESS);
        EXPECT_EQ(contents<int>(to, 1).front(), arguments.expected);
    }

    cl_int status = CL_SUCCESS;
    kernel.setKernelArgBuffer(3, to, status);
    EXPECT_EQ(status, CL_INVALID_ARG_INDEX);
    const std::uint64_t calls = clshim::calls();
    kernel.setKernelArgBuffer(0, to, status);
    HOpenCLUtils::setKernelArg(kernel, 1, sizeof(cl_mem), &null, status);
    EXPECT_EQ(status, CL_INVALID_ARG_INDEX);
    EXPECT_EQ(clshim::calls(), calls);
    EXPECT_EQ(takeFailure(), "clSetKernelArg: CL_INVALID_ARG_INDEX (-49), argument 3");
    status = CL_SUCCESS;
    HOpenCLUtils::setKernelArg(HOpenCLKernelInfo(), 0, sizeof(cl_mem), &null, status);
    EXPECT_EQ(status, CL_INVALID_KERNEL);
    takeFailure();
}

TEST_F(GpuKernels, AreToldOfAnArgumentOnceUntilItIsAnother) {
    const HString file = write("add.cl", "__kernel void add(__global int* to, __global int* a, uint b) {\n"
                                         "    if (get_global_id(0) == 0) to[0] = (a ? a[0] : 100) + (int)b;\n}\n");
    HOpenCLKernelInfo kernel;
    ASSERT_TRUE(kernel.loadOrUpdate(file, "add", 1));
    HOpenCLBuffer to, a, other;
    ASSERT_TRUE(upload<int>({0}, to) == CL_SUCCESS && upload<int>({1}, a) == CL_SUCCESS &&
                upload<int>({2}, other) == CL_SUCCESS);
    const auto ofNewMemory = [&] { // which often lies where the old one did
        a.reset();
        ASSERT_EQ(upload<int>({3}, a), CL_SUCCESS);
    };
    const auto refuse = [&] {
        cl_int status = CL_SUCCESS;
        clshim::failCallOf("clSetKernelArg", 1, CL_OUT_OF_RESOURCES);
        kernel.setKernelArgBuffer(1, other, status);
        EXPECT_EQ(std::exchange(status, CL_SUCCESS), CL_OUT_OF_RESOURCES);
        takeFailure();
    };
    const struct {
        const char* what;
        std::function<void()> before;
        HOpenCLBuffer& a;
        bool isValid;
        cl_uint b;
        int expected;
        std::uint64_t told;
    } rows[] = {{"all are new", [] {}, a, true, 10, 11, 3},
                {"none is", [] {}, a, true, 10, 11, 0},
                {"another value", [] {}, a, true, 20, 21, 1},
                {"another buffer", [] {}, other, true, 20, 22, 1},
                {"no buffer", [] {}, other, false, 20, 120, 1},
                {"none again", [] {}, a, false, 20, 120, 0},
                {"a buffer again", [] {}, a, true, 20, 21, 1},
                {"of new memory", ofNewMemory, a, true, 20, 23, 1},
                {"after one that failed", refuse, a, true, 20, 23, 1},
                {"of a kernel that others have", [&] { kernel.kernel(); }, a, true, 20, 23, 3}};
    for (const auto& row : rows) {
        SCOPED_TRACE(row.what);
        row.before();
        const std::uint64_t before = clshim::calls("clSetKernelArg");
        cl_int status = CL_SUCCESS;
        kernel.setKernelArgBuffer(0, to, status);
        kernel.setKernelArgBuffer(1, row.a, status, row.isValid);
        HOpenCLUtils::setKernelArg(kernel, 2, sizeof row.b, &row.b, status);
        EXPECT_EQ(clshim::calls("clSetKernelArg") - before, row.told);
        ASSERT_TRUE(status == CL_SUCCESS && kernel.enqueueKernel({}, nullptr) == CL_SUCCESS);
        EXPECT_EQ(contents<int>(to, 1).front(), row.expected);
    }
}

TEST_F(GpuKernels, AreCompiledAgainOnlyWhenAFileChanges) {
    const auto builds = [] { return clshim::calls("clBuildProgram"); };
    const HStringArray folders = {folder("first"), folder("second \"of two\"")};
    write("second \"of two\"/value.h", "#define VALUE 1\n");
    const char* const source = "# include  <value.h> // of a folder";
    const HString file = writeAnswer("a.cl", source, "VALUE");
    const std::uint64_t before = builds();
    for (int i = 0; i < 3; ++i)
        ASSERT_EQ(answerOf(file, &folders), 1);
    EXPECT_EQ(builds(), before + 1);

    const struct {
        const char* what;
        int expected;
        std::function<void()> change;
    } changes[] = {
        {"the file", 11, [&] { writeAnswer("a.cl", source, "VALUE + 10"); }},
        {"the included file", 12, [&] { write("second \"of two\"/value.h", "#define VALUE 2\n"); }},
        {"a file that now comes first", 13, [&] { write("first/value.h", "#define VALUE 3\n"); }},
        {"one beside the file", 14, [&] { write("value.h", "#define VALUE 4\n"); }},
        {"one gone", 13, [&] { std::filesystem::remove(folder("value.h").asChar()); }},
        {"what the device can do", 13, [] { Gpu::assumeNoDoubles(true); }},
        {"the device", 13, [] { closeDevice(); }},
    };
    std::uint64_t expected = before + 1;
    for (const auto& change : changes) {
        change.change();
        EXPECT_EQ(answerOf(file, &folders), change.expected) << change.what;
        EXPECT_EQ(answerOf(file, &folders), change.expected) << change.what;
        EXPECT_EQ(builds(), ++expected) << change.what;
    }
    EXPECT_EQ(takeFailure(), "");
}

TEST_F(GpuKernels, ThatAreLoadedFollowTheirFileAndTheDevice) {
    const HString file = writeAnswer("kept.cl", "", "1");
    HOpenCLKernelInfo kernel;
    const auto isAnother = [&] {
        const std::uint64_t made = clshim::calls("clCreateKernel");
        EXPECT_TRUE(kernel.loadOrUpdate(file, "answer", 1));
        return clshim::calls("clCreateKernel") > made;
    };
    EXPECT_TRUE(isAnother());
    EXPECT_FALSE(isAnother());
    closeDevice();
    EXPECT_TRUE(isAnother());
    Gpu::assumeNoDoubles(true);
    EXPECT_TRUE(isAnother());
    writeAnswer("kept.cl", "", "22");
    EXPECT_TRUE(isAnother());
    EXPECT_FALSE(isAnother());
    {
        const OneLook look;
        EXPECT_FALSE(isAnother());
        writeAnswer("kept.cl", "", "333");
        EXPECT_FALSE(isAnother()) << "it was looked at";
        const OneLook another;
        EXPECT_TRUE(isAnother());
    }
    writeAnswer("kept.cl", "", "4444");
    EXPECT_TRUE(isAnother());
}

TEST_F(GpuKernels, IncludeAsACompilerDoes) {
    const struct {
        const char* what;
        std::vector<std::pair<const char*, const char*>> files;
        const char* source;
        const char* value;
    } cases[] = {
        {"a guard, included twice",
         {{"g.h", "#ifndef G\n#define G\nconstant int g = 5;\n#endif"}},
         "#include \"g.h\"\n#include \"g.h\"",
         "g"},
        {"once", {{"o.h", "#pragma once\nconstant int o = 5;"}}, "#include \"o.h\"\n#include \"o.h\"", "o"},
        {"no guard, included twice",
         {{"t.h", "{ 5 },"}},
         "constant int t[] = {\n#include \"t.h\"\n#include \"t.h\"\n};",
         "t[1]"},
        {"files that include each other",
         {{"x.h", "#include \"y.h\"\n#define X 2"}, {"y.h", "#include \"x.h\"\n#define Y 3"}},
         "#include \"x.h\"",
         "X + Y"},
        {"beside the one that includes",
         {{"sub/p.h", "#include \"q.h\""}, {"sub/q.h", "#define Q 5\n"}},
         "#include \"sub/p.h\"",
         "Q"},
        {"what is switched off", {}, "#if 0\n#include \"none.h\"\n#endif", "5"},
        {"the place of a line", {{"l.h", "\n\n"}}, "#include \"l.h\"", "__LINE__ + 3"}, // it is line 2
    };
    for (const auto& each : cases) {
        for (const auto& [name, text] : each.files)
            write(name, text);
        EXPECT_EQ(answerOf(writeAnswer("including.cl", each.source, each.value)), 5) << each.what;
    }
    EXPECT_EQ(takeFailure(), "");
}

TEST_F(GpuKernels, ThatCannotBeLoadedSayWhyAndLeaveNone) {
    const HString good = writeAnswer("good.cl", "", "1");
    const HString broken = writeAnswer("broken.cl", "", "unheardOf");
    const struct {
        HString file;
        const char* kernel;
        testing::Matcher<std::string> reason;
    } cases[] = {
        {folder("none.cl"), "answer", AllOf(HasSubstr("none.cl"), HasSubstr("does not exist"))},
        {folder(""), "answer", HasSubstr("it is no regular file")},
        {good, "question", AllOf(HasSubstr("clCreateKernel: CL_INVALID_KERNEL_NAME"), HasSubstr("\"question\""))},
        {broken, "answer",
         AllOf(HasSubstr("CL_BUILD_PROGRAM_FAILURE"), HasSubstr("broken.cl"), HasSubstr("unheardOf"))},
    };
    for (const auto& failing : cases) {
        HOpenCLKernelInfo kernel;
        ASSERT_TRUE(kernel.loadOrUpdate(good, "answer", 1));
        for (int i = 0; i < 2; ++i) {
            EXPECT_FALSE(kernel.loadOrUpdate(failing.file, failing.kernel, 1));
            EXPECT_THAT(takeFailure(), failing.reason);
            EXPECT_FALSE(kernel.isLoaded());
            EXPECT_EQ(kernel.kernel(), nullptr);
        }
    }
}

TEST_F(GpuKernels, ABrokenTextIsCompiledOnceAndAFailureOfTheDeviceIsNotKept) {
    const auto builds = [] { return clshim::calls("clBuildProgram"); };
    const std::uint64_t before = builds();
    const HString file = writeAnswer("a.cl", "", "unheardOf");
    EXPECT_EQ(answerOf(file), -1);
    EXPECT_EQ(answerOf(file), -1);
    EXPECT_EQ(builds(), before + 1);
    takeFailure();
    writeAnswer("a.cl", "", "5");
    EXPECT_EQ(answerOf(file), 5);
    EXPECT_EQ(builds(), before + 2);

    const HString other = writeAnswer("b.cl", "", "6");
    clshim::failCall(2, CL_OUT_OF_HOST_MEMORY); // after clCreateProgramWithSource
    EXPECT_EQ(answerOf(other), -1);
    EXPECT_EQ(clshim::failedCall(), "clBuildProgram");
    EXPECT_THAT(takeFailure(), AllOf(HasSubstr("clBuildProgram: CL_OUT_OF_HOST_MEMORY (-6)"), HasSubstr("b.cl")));
    EXPECT_EQ(answerOf(other), 6);
}

TEST_F(GpuKernels, AreCompiledOnceForAllThreads) {
    const HString file = writeAnswer("a.cl", "", "5");
    const std::uint64_t before = clshim::calls("clBuildProgram");
    std::array<int, 4> answers = {};
    std::vector<std::thread> threads;
    threads.reserve(answers.size());
    for (int& answer : answers)
        threads.emplace_back([&] { answer = answerOf(file); });
    for (std::thread& thread : threads)
        thread.join();
    EXPECT_THAT(answers, testing::Each(5));
    EXPECT_EQ(clshim::calls("clBuildProgram"), before + 1);
}

TEST_F(GpuKernels, KnowWhetherThereAreDoubles) {
    const HString file =
        writeAnswer("a.cl", "#ifdef NW_WITHOUT_DOUBLES\n#define VALUE 0\n#else\n#define VALUE 1\n#endif", "VALUE");
    EXPECT_EQ(answerOf(file), currentDevice()->hasDoubles ? 1 : 0);
    Gpu::assumeNoDoubles(true);
    EXPECT_EQ(answerOf(file), 0);
    Gpu::assumeNoDoubles(false);
    EXPECT_EQ(answerOf(file), currentDevice()->hasDoubles ? 1 : 0);
}

} // namespace
