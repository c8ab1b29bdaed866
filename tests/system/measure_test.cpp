// What the tool measures: compare and scope.
#include <nlohmann/json.hpp>

#include "tests/system/tool.h"

namespace {

using Json = nlohmann::json;
using testing::HasSubstr;

// Frames of 64x48 I420, each of one level in all planes.
std::string flat(std::initializer_list<int> levels, size_t bytes = 64 * 48 * 3 / 2) {
    std::string all;
    for (const int level : levels) all.append(bytes, static_cast<char>(level));
    return all;
}

class Measure : public Tool {
  protected:
    Json json(const Words& arguments) const {
        return Json::parse(works(asYuv(arguments + Words{"--json"})).out);
    }
};

TEST_F(Measure, PicturesAreComparedOneByOne) {
    folder.write("a.yuv", flat({100, 100, 100, 100}));
    folder.write("b.yuv", flat({100, 102, 110, 100}));
    const Json all = json({"compare", "a.yuv", "b.yuv"});
    EXPECT_EQ(all["frames"], 4);
    ASSERT_EQ(all["each"].size(), 4u);
    EXPECT_TRUE(all["each"][0]["psnr"]["y"].is_null()) << "equal";
    EXPECT_EQ(all["each"][0]["ssim"]["all"], 1.0);
    EXPECT_NEAR(all["each"][1]["psnr"]["u"].get<double>(), 42.1102, 1e-4);  // an error of 4
    EXPECT_NEAR(all["mean"]["psnr"]["all"].get<double>(), 33.9811, 1e-4);   // of (0 + 4 + 100 + 0) / 4
    EXPECT_EQ(all["worst"][0]["frame"], 2);
    EXPECT_EQ(all["worst"][1]["frame"], 1);
    EXPECT_EQ(all["unmatched"]["first"], 0);
    const Outcome o = works(asYuv({"compare", "a.yuv", "b.yuv", "--frames"}));
    EXPECT_THAT(o.out, HasSubstr("\nmean         PSNR 33.98 dB"));
    EXPECT_THAT(o.out, HasSubstr("\nworst 2      PSNR 28.13 dB"));
    EXPECT_THAT(o.out, HasSubstr("0            PSNR inf dB"));
}

TEST_F(Measure, OffsetsLeavePicturesAlone) {
    folder.write("a.yuv", flat({10, 20, 30, 40}));
    folder.write("b.yuv", flat({99, 10, 20}));
    const Json later = json({"compare", "a.yuv", "b.yuv", "--offset", "1"});
    EXPECT_EQ(later["frames"], 2);
    EXPECT_TRUE(later["mean"]["psnr"]["all"].is_null());
    EXPECT_EQ(later["unmatched"]["first"], 2);
    EXPECT_EQ(later["unmatched"]["second"], 1);
    const Json earlier = json({"compare", "b.yuv", "a.yuv", "--offset=-1"});
    EXPECT_EQ(earlier["each"][0]["frame"], 1);
    EXPECT_TRUE(earlier["mean"]["psnr"]["all"].is_null());
    EXPECT_THAT(works(asYuv({"compare", "a.yuv", "b.yuv"})).err, HasSubstr("1 of its pictures"));
}

TEST_F(Measure, LimitsAndWrongUseHaveTheirStatus) {
    folder.write("a.yuv", flat({100, 100}));
    folder.write("b.yuv", flat({100, 110}));
    folder.write("c.yuv", flat({100}));
    works(asYuv({"compare", "a.yuv", "b.yuv", "--min-psnr", "31.1"}));
    const Outcome low = tarsel(asYuv({"compare", "a.yuv", "b.yuv", "--min-psnr", "31.2"}));
    failsAs(6, low, {"'b.yuv' failed its check", "31.14 dB, below 31.2"}, "low");
    EXPECT_THAT(low.out, HasSubstr("worst 1")) << "the result is printed";
    failsAs(6, tarsel(asYuv({"compare", "a.yuv", "c.yuv", "--min-psnr", "1"})),
            {"'a.yuv'", "1 of its pictures"}, "alone");
    refuses(asYuv({"compare", "a.yuv", "b.yuv"}),
            {
                {{"--min-psnr", "much"}, {"--min-psnr", "a number from 0 to 1000"}},
                {{"--offset", "x"}, {"--offset", "a whole number"}},
                {{"--offset", "9"}, {"no picture of one"}},
                {{"--sheet", "sheet.jpg"}, {"--sheet 'sheet.jpg'", ".png"}},
            });
    fails(2, asYuv({"compare", "a.yuv", "testgen:size=32x32,duration=1"}), {"64x48 and 32x32"});
    fails(3, asYuv({"compare", "a.yuv", "absent.yuv"}), {"absent.yuv"});
    folder.write("cut.yuv", flat({100}) + "x");
    for (const Words& command : {Words{"compare", "a.yuv"}, Words{"scope"}})
        fails(3, asYuv(command + Words{"cut.yuv"}), {"'cut.yuv' is damaged", "copy or make it again"});
}

TEST_F(Measure, SheetsAndWaveformsArePictures) {
    folder.write("a.yuv", flat({100, 100}));
    folder.write("b.yuv", flat({100, 110}));
    // Width and height in the header of a PNG, high bytes first.
    const auto sizeOf = [this](const std::string& name) {
        const std::string bytes = contents(name);
        const auto at = [&](size_t i) { return i < bytes.size() ? static_cast<unsigned char>(bytes[i]) : 0; };
        return std::to_string(at(18) * 256 + at(19)) + "x" + std::to_string(at(22) * 256 + at(23));
    };
    works(asYuv({"compare", "a.yuv", "b.yuv", "--sheet", "sheet.png"}));
    EXPECT_EQ(sizeOf("sheet.png"), "224x120") << "two rows of three pictures";
    works(asYuv({"scope", "a.yuv", "-o", "wave.png"}));
    EXPECT_EQ(sizeOf("wave.png"), "128x256");
    fails(4, asYuv({"scope", "a.yuv", "-o", "wave.png"}), {"wave.png"});
}

TEST_F(Measure, ScopesCountLevels) {
    folder.write("a.yuv", flat({10, 100, 238, 100}));
    const Json all = json({"scope", "a.yuv"});
    EXPECT_EQ(all["frames"], 4);
    const Json luma = all["channels"][0];
    EXPECT_EQ(luma["channel"], "Y");
    EXPECT_EQ(luma["min"], 10);
    EXPECT_EQ(luma["max"], 238);
    EXPECT_EQ(luma["below"], 0.25);
    EXPECT_EQ(luma["above"], 0.25);
    EXPECT_EQ(luma["histogram"][100], 2 * 64 * 48);
    EXPECT_EQ(all["channels"][1]["above"], 0.0);
    EXPECT_EQ(json({"scope", "a.yuv", "--at", "2f"})["channels"][0]["min"], 238);
    EXPECT_THAT(works(asYuv({"scope", "a.yuv", "--at", "0"})).out,
                HasSubstr("1 picture\nY  10 to 10, mean 10.0"));
    EXPECT_NE(tarsel(asYuv({"scope", "a.yuv", "--at", "9"})).status, 0);
}

}  // namespace
