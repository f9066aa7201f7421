// SPDX-License-Identifier: Apache-2.0
// Files that are not characters, whether by accident or on purpose.
#include "quarn/character/characterFiles.h"
#include "quarn/character/readCharacter.h"
#include "support/TemporaryFolder.h"
#include "support/failureOf.h"

#include <gmock/gmock.h>

#include <fstream>
#include <limits>

#include <sys/stat.h>

namespace quarn {
namespace {

using testing::AllOf;
using testing::HasSubstr;

TEST(DamagedCharacters, PathsThatAreNoFiles) {
    const TemporaryFolder folder;
    const std::string base = folder.path().string();
    const auto refused = [](const std::string& path, const std::string& reason) {
        EXPECT_EQ(failureOf([&] { readCharacter(path); }), path + ": " + reason);
    };
    refused(base + "/none.gltf", "does not exist");
    // nobody writes into these pipes, and nobody waits for that
    for (const char* pipe : {"/pipe.glb", "/buffer.bin"})
        ASSERT_EQ(mkfifo((base + pipe).c_str(), 0666), 0);
    refused(base + "/pipe.glb", "is no regular file");
    std::ofstream(base + "/large.fbx").close();
    std::filesystem::resize_file(base + "/large.fbx", std::uintmax_t{20} << 30U);
    refused(base + "/large.fbx", "has 21474836480 bytes, and at most 4294967295 are read");
    std::string text = Strip().write().text();
    const std::size_t data = text.find("data:application");
    text.replace(data, text.find('"', data) - data, "buffer.bin");
    std::ofstream(base + "/pipe.gltf") << text;
    EXPECT_THAT(failureOf([&] { readCharacter(base + "/pipe.gltf"); }), HasSubstr("buffer.bin"));
    refused(base + "/x.obj", "\".obj\" is not one of the endings .gltf, .glb, .fbx and .dae");
}

// one replacement in the text of the strip
TEST(DamagedCharacters, TextsAreRefusedWithTheReason) {
    const std::string sound = Strip().write().text();
    const std::string nested(100000, '[');
    const struct {
        const char* reason;
        std::string what, by;
    } damages[] = {
        {"glTF of version \"1.0\", not 2", "\"2.0\"", "\"1.0\""},
        {"line 1, column ", "\"scene\":0", "\"scene\":"},
        {"nested more than 200 levels deep", "\"scene\":0", "\"scene\":" + nested},
        {"\"nodes\" is not an array", "\"nodes\":[{", "\"nodes\":7,\"x\":[{"},
        {"one of the nodes is not an object", "\"nodes\":[{", "\"nodes\":[1,{"},
        {"nodes[0] refers to nodes[9], but there are 3", "\"children\":[1]", "\"children\":[9]"},
        {"names one of the nodes by something that is no index", "\"children\":[1]", "\"children\":[-1]"},
        {"nodes[0] is its own ancestor", "\"children\":[1]", "\"children\":[0]"},
        {"nodes[1] is a child twice", "\"children\":[1]", "\"children\":[1,1]"},
        {"nodes[2] refers to meshes[4], but there are 1", "\"mesh\":0", "\"mesh\":4"},
        {"nodes[2] refers to skins[1], but there are 1", "\"skin\":0", "\"skin\":1"},
        {"skins[0] refers to nodes[3], but there are 3", "\"joints\":[0,1]", "\"joints\":[0,3]"},
        {"skins[0] has nodes[1] twice", "\"joints\":[0,1]", "\"joints\":[1,1]"},
        {"skins[0] has 3 joints, but 2 inverse bind matrices", "\"joints\":[0,1]", "\"joints\":[0,1,2]"},
        {"has no positions", "\"POSITION\"", "\"POSITIO\""},
        {"uses accessors[1], which does not hold weights by fours", "\"WEIGHTS_0\":3", "\"WEIGHTS_0\":1"},
        {"accessors[0]: 9 elements leave bufferViews[0]", "\"count\":8,\"type\":\"VEC3\"",
         "\"count\":9,\"type\":\"VEC3\""},
        {"accessors[0]: 4000000000 elements leave", "\"count\":8,\"type\":\"VEC3\"",
         "\"count\":4000000000,\"type\":\"VEC3\""},
        {"accessors[0]: \"count\" is not a size", "\"count\":8,\"type\":\"VEC3\"", "\"count\":-1,\"type\":\"VEC3\""},
        {"accessors[0]: \"componentType\" is none", "\"componentType\":5126", "\"componentType\":1"},
        {"bufferViews[0] leaves its buffer", "\"byteOffset\":0", "\"byteOffset\":4000"},
        {"", "\"indices\":1", "\"indices\":3"},                                   // floats for indices
        {"", "\"JOINTS_0\":2", "\"JOINTS_0\":3"},                                 // and for joints
        {"", "\"JOINTS_0\":2,\"WEIGHTS_0\":3", "\"JOINTS_0\":0,\"WEIGHTS_0\":0"}, // of three components
        {"", "\"POSITION\":0", "\"POSITION\":2"},                                 // joints for positions
        {"", "base64,", "base64,AAAA!!"},                                         // not base64
        {"", "\"buffers\":[{\"byteLength\":", "\"buffers\":[{\"byteLength\":9"},  // more than there is
        {"the file has no mesh", "\"mesh\":0,", ""},
        {"the file needs the glTF extension \"EXT_x\"", "\"scene\":0",
         "\"scene\":0,\"extensionsRequired\":[\"EXT_x\"]"},
    };
    for (const auto& damage : damages) {
        SCOPED_TRACE(damage.by.substr(0, 80));
        std::string text = sound;
        const std::size_t at = text.find(damage.what);
        ASSERT_NE(at, std::string::npos) << damage.what;
        text.replace(at, damage.what.size(), damage.by);
        EXPECT_THAT(failureOf([&] { readBytesAs("damaged.gltf", text); }),
                    AllOf(HasSubstr("damaged.gltf: "), HasSubstr(damage.reason)));
    }
}

TEST(DamagedCharacters, NumbersAreRefusedWithTheReason) {
    const auto refused = [](const Strip& strip, const std::string& reason) {
        EXPECT_THAT(failureOf([&] { read(strip.write()); }), AllOf(HasSubstr("character.gltf: "), HasSubstr(reason)));
    };
    Strip broken, heavy;
    broken.more = [](GltfWriter& file) {
        auto points = stripPoints();
        points[5] = std::numeric_limits<float>::quiet_NaN();
        file.replace("POSITION", file.floats("VEC3", points));
    };
    heavy.seam[0] = std::numeric_limits<float>::infinity();
    refused(broken, "the mesh \"arm\" has a position that is not finite at vertex 1");
    refused(heavy, "the mesh \"arm\" has a weight that is not finite at vertex 1");
}

} // namespace
} // namespace quarn
