// SPDX-License-Identifier: Apache-2.0
// quarn pose with poses made by hand.
#include "PoseTest.h"

namespace {

using ::testing::HasSubstr;

class KeyPosesTest : public PoseTest {};

const char* const animation = "createNode animCurve -name wag; setAttr wag.keyTimes 1 9; setAttr wag.keyValues 0 1\n"
                              "connectAttr time1.outTime wag.time; connectAttr wag.output middle.rotateY\n";

TEST_F(KeyPosesTest, KeysPlayAndTheOtherControlsRest) {
    stripScene::write(scene(), animation);
    pose({"--samples", "20"}); // those poses must not show through
    std::filesystem::rename(path("posed.json"), scene());
    const std::string keys = write("hand.json", R"({"unit": "degrees", "interpolation": "smooth", "keys": {
        "middle.rotateX": [[1, 0], [11, 90], [21, 90], [31, -45.5]], "tip.tx": [[1, 0.5], [40.5, 2]]}})");
    EXPECT_THAT(pose({"--keys", keys, "--json"}), HasSubstr("\"held\": 3"));
    const auto session = open();
    const double right = 1.5707963267948966;
    EXPECT_EQ(at(*session, 1, "middle.rotateX"), 0.0);
    EXPECT_NEAR(at(*session, 6, "middle.rotateX"), right / 2.0, 1e-12);
    EXPECT_NEAR(at(*session, 11, "middle.rotateX"), right, 1e-12);
    EXPECT_NEAR(at(*session, 17, "middle.rotateX"), right, 1e-12); // does not go beyond a level stretch
    EXPECT_NEAR(at(*session, 31, "middle.rotateX"), -45.5 * right / 90.0, 1e-12);
    EXPECT_EQ(at(*session, 50, "tip.translateX"), 2.0); // a length is no angle
    for (const double frame : {1.0, 15.0}) {
        EXPECT_EQ(at(*session, frame, "middle.rotateY"), 0.0);
        EXPECT_EQ(at(*session, frame, "tip.rotateZ"), 0.5); // its default
    }
    EXPECT_EQ(quarn::numberOf(quarn::findPlug("warp.exportStartFrame")), 1.0);
    EXPECT_EQ(quarn::numberOf(quarn::findPlug("warp.exportEndFrame")), 41.0);
}

TEST_F(KeyPosesTest, OthersMayKeepTheirAnimation) {
    stripScene::write(scene(), std::string(animation) + "\ncreateNode sliders -name face; "
                                                        "setAttr face.slider[3].sliderName \"left.blink\"");
    pose({"--others", "keep", "--keys",
          write("k.json", R"({"keys": {"tip.rotateZ": [[1, 0], [5, 1]], "face.left.blink": [[1, 0], [5, 2]]}})")});
    const auto session = open();
    EXPECT_EQ(at(*session, 5, "middle.rotateY"), 0.5);
    EXPECT_EQ(at(*session, 4, "tip.rotateZ"), 0.75);
    EXPECT_EQ(at(*session, 3, "face.output[3]"), 1.0); // by the slider's name
}

// each row: a file, and what the failure says
TEST_F(KeyPosesTest, DamagedFilesAreRefusedByName) {
    stripScene::write(scene(), "setAttr -lock on root.rotate; createNode sliders -name face; "
                               "setAttr face.slider[0].sliderName a; setAttr face.slider[1].sliderName a");
    const auto keys = [](const std::string& list) { return R"({"keys": {"tip.rotateZ": )" + list + "}}"; };
    const std::pair<std::string, const char*> rows[] = {
        {"{\n \"keys\": [,", "line 2, column 11"},
        {"[]", "no JSON object"},
        {"{}", "\"keys\""},
        {R"({"keys": {}})", "\"keys\""},
        {R"({"keys": [1]})", "\"keys\""},
        {R"({"keys": {"tip.rx": [[1, 0]]}, "units": "degrees"})", "\"units\""},
        {R"({"keys": {"tip.rx": [[1, 0]]}, "keys": {"tip.rx": [[1, 0]]}})", "\"keys\" twice"},
        {R"({"unit": "turns", "keys": {"tip.rx": [[1, 0]]}})", R"("radians", "degrees")"},
        {R"({"unit": 1, "keys": {"tip.rx": [[1, 0]]}})", "\"unit\""},
        {R"({"interpolation": "spline", "keys": {"tip.rx": [[1, 0]]}})", "\"interpolation\""},
        {R"({"keys": {"thumb.rotateX": [[1, 0]]}})", "thumb.rotateX"},
        {R"({"keys": {"tip.twist": [[1, 0]]}})", "tip.twist"},
        {R"({"keys": {"tip": [[1, 0]]}})", "tip"},
        {R"({"keys": {"face.a": [[1, 0]]}})", "face.a is the name of both face.slider[0] and face.slider[1]"},
        {R"({"keys": {"face.b": [[1, 0]]}})", "face.b"},
        {R"({"keys": {"": [[1, 0]]}})", "no plug"},
        {R"({"keys": {"tip.rotate": [[1, 0]]}})", "tip.rotate, which is no number"},
        {R"({"keys": {"tip.matrix": [[1, 0]]}})", "tip.matrix, which is no number"},
        {R"({"keys": {"warp.controlValues": [[1, 0]]}})", "warp.controlValues, which is no number"},
        {R"({"keys": {"time1.outTime": [[1, 0]]}})", "time1.outTime, which is an output"},
        {R"({"keys": {"root.rotateX": [[1, 0]]}})", "root.rotateX, which is locked"},
        {R"({"keys": {"tip.rx": [[1, 0]], "tip.rotateX": [[1, 0]]}})", "tip.rotateX twice"},
        {R"({"keys": {"tip.rotateX": [[1, 0]], "tip.rotateX": [[1, 0]]}})", "tip.rotateX twice"},
        {keys("{}"), "tip.rotateZ"},
        {keys("[]"), "tip.rotateZ"},
        {keys("[[1, 0], [2]]"), "key 2 of tip.rotateZ"},
        {keys("[[1, 0, 0]]"), "key 1 of tip.rotateZ"},
        {keys("[[1, null]]"), "key 1 of tip.rotateZ"},
        {keys("[[1, 0], [\"2\", 0]]"), "key 2 of tip.rotateZ"},
        {keys("[[1, 0], [1, 1]]"), "key 2 of tip.rotateZ that is not after"},
        {keys("[[2, 0], [1, 1]]"), "key 2 of tip.rotateZ that is not after"},
        {keys("[[1e9, 0]]"), "key 1 of tip.rotateZ beyond frame"},
        {keys("[[1, NaN]]"), "no JSON at line 1"},
        {R"({"interpolation": "smooth", "keys": {"tip.rx": [[1, 0], [1.0001, 8e307], [1.0002, 1.7e308]]}})",
         "too steep"},
    };
    for (const auto& [text, says] : rows) {
        const std::string file = write("hostile.json", text);
        const std::string failure = poseFailure({"--keys", file});
        EXPECT_THAT(failure, HasSubstr(says)) << text.substr(0, 200);
        EXPECT_THAT(failure, HasSubstr("hostile.json"));
    }
    EXPECT_THAT(poseFailure({"--keys", path("none.json")}), HasSubstr("none.json"));
    EXPECT_FALSE(std::filesystem::exists(path("posed.json")));
}

} // namespace
