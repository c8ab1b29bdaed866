#include "core/image/qvimage.h"

#include <png.h>
#include <zlib.h>

#include <cstdio>

#include "core/engine/status.h"
#include "core/media/qvframe.h"
#include "tests/core/media/frame_model.h"
#include "tests/support/checks.h"

namespace {

using namespace QvFourcc;

// An image file of 3x1 pixels in any form, made without the code under test.
struct Image {
    int depth, type, interlace;
    bool transparent;  // entry 1 of the palette, or the key 1,1,1
    std::string row;
    const char* pixels;  // what a reader of 8 bits gets: red, green, blue, alpha of each

    void write(const std::string& name) const {
        std::unique_ptr<std::FILE, int (*)(std::FILE*)> file(std::fopen(name.c_str(), "wb"), std::fclose);
        png_structp png = png_create_write_struct(PNG_LIBPNG_VER_STRING, nullptr, nullptr, nullptr);
        png_infop info = png_create_info_struct(png);
        png_init_io(png, file.get());
        png_set_IHDR(png, info, 3, 1, depth, type, interlace, PNG_COMPRESSION_TYPE_DEFAULT,
                     PNG_FILTER_TYPE_DEFAULT);
        const png_color colours[] = {{0, 200, 0}, {3, 199, 1}, {6, 198, 2}, {9, 197, 3}};
        if (type == PNG_COLOR_TYPE_PALETTE) png_set_PLTE(png, info, colours, 1 << depth);
        const png_byte paletteAlpha[] = {255, 0};
        const png_color_16 key{1, 1, 1, 1, 1};
        if (transparent) png_set_tRNS(png, info, paletteAlpha, 2, &key);
        png_write_info(png, info);
        auto* data = reinterpret_cast<png_bytep>(const_cast<char*>(row.data()));
        png_write_image(png, &data);
        png_write_end(png, info);
        png_destroy_write_struct(&png, &info);
    }
};

constexpr int flat = PNG_INTERLACE_NONE, woven = PNG_INTERLACE_ADAM7;
constexpr int gray = PNG_COLOR_TYPE_GRAY, rgb = PNG_COLOR_TYPE_RGB, palette = PNG_COLOR_TYPE_PALETTE;
constexpr int grayAlpha = PNG_COLOR_TYPE_GRAY_ALPHA, rgba = PNG_COLOR_TYPE_RGBA;
const Image images[] = {
    {16, rgba, woven, false,
     "\1\x99\2\x99\3\x99\4\x99\x11\x99\x12\x99\x13\x99\xFF\x99\xF1\x99\xF2\x99\xF3\x99\x80\x99",
     "01020304 111213ff f1f2f380"},
    {8, grayAlpha, flat, false, "\x0A\xFF\x80\x40\xFF\x01", "0a0a0aff 80808040 ffffff01"},
    {8, rgb, flat, true, "\1\1\1\1\1\2\7\x08\x09", "01010100 010102ff 070809ff"},
    {2, gray, flat, true, "\x1C", "000000ff 55555500 ffffffff"},
    {4, gray, woven, false, "\x0F\x80", "000000ff ffffffff 888888ff"},
    {2, palette, flat, true, "\x1C", "00c800ff 03c70100 09c503ff"},
};

TEST(QvImageLoad, EveryKindOfPng) {
    const TempFolder folder;
    const std::string name = folder.file("image.png");
    for (const auto& image : images) {
        SCOPED_TRACE("type " + std::to_string(image.type) + " depth " + std::to_string(image.depth));
        image.write(name);
        const bool hasAlpha = (image.type & PNG_COLOR_MASK_ALPHA) || image.transparent;
        QvFrame picture, alpha;
        ASSERT_EQ(QvImage::loadFrame(picture, narrow(name), &alpha, 7), 0);
        ASSERT_TRUE(picture.four_cc() == BGR4 && picture.width() == 4 && picture.height() == 2);
        ASSERT_TRUE(alpha.inited() == hasAlpha && (!hasAlpha || alpha.four_cc() == GRAY));
        for (int i = 0; i < 8; ++i) {
            const std::string wanted =
                i < 3 ? std::string(image.pixels).substr(static_cast<std::size_t>(9 * i), 8) : "00000000";
            const unsigned char* const p = picture.pixelPtr(i % 4, i / 4);
            const unsigned opacity = hasAlpha ? *alpha.pixelPtr(i % 4, i / 4) : i < 3 ? 255 : 0;
            char text[9];
            std::snprintf(text, sizeof text, "%02x%02x%02x%02x", p[2], p[1], p[0], opacity);
            EXPECT_EQ(text, wanted) << i;
            EXPECT_EQ(p[3], 0);
        }
    }
}

TEST(QvImageLoad, SurvivesDamage) {
    const TempFolder folder;
    const std::string name = folder.file("image.png");
    const auto load = [&](const std::string& bytes) {
        QvFrame picture, alpha;
        const int result = QvImage::loadFrame(picture, narrow(folder.write("bad.png", bytes)), &alpha);
        return result == 0 && picture.inited() ? 1 : result;
    };
    images[0].write(name);
    const std::string whole = TempFolder::read(name);
    for (std::size_t length = 8; length < whole.size(); ++length) EXPECT_GE(load(whole.substr(0, length)), 0);
    for (std::size_t at = 8; at < whole.size(); ++at) {
        std::string damaged = whole;
        damaged[at] = static_cast<char>(damaged[at] ^ 0x55);
        EXPECT_GE(load(damaged), 0) << at;
    }
    // Headers with right checksums that claim more than the file can hold take no memory.
    for (const char* claim : {"\x7f\xff\xff\xff\x7f\xff\xff\xff", "\x00\x00\x4e\x20\x00\x00\x4e\x20"}) {
        std::string huge = whole;
        huge.replace(16, 8, claim, 8);
        const auto crc = crc32(0, reinterpret_cast<const Bytef*>(huge.data()) + 12, 17);
        for (int i = 0; i < 4; ++i)
            huge[static_cast<std::size_t>(29 + i)] = static_cast<char>(crc >> (24 - 8 * i));
        EXPECT_EQ(load(huge), 0);  // and no picture
    }
}

TEST(QvImageSave, BmpIsExact) {
    const TempFolder folder;
    const std::string name = folder.file("saved.bmp");
    QvFrame frame = noiseFrame(BGR3, 3, 2, 0, 1);
    ASSERT_EQ(QvImage::saveFrame(frame, narrow(name), QvImage::bmp), 0);
    const unsigned char header[] = {'B', 'M', 78,   0,    0, 0, 0,    0,    0, 0, 54, 0, 0, 0, 40, 0, 0,  0,
                                    3,   0,   0,    0,    2, 0, 0,    0,    1, 0, 24, 0, 0, 0, 0,  0, 24, 0,
                                    0,   0,   0x13, 0x0b, 0, 0, 0x13, 0x0b, 0, 0, 0,  0, 0, 0, 0,  0, 0,  0};
    std::string wanted(std::begin(header), std::end(header));
    for (int y = 1; y >= 0; --y)
        wanted += std::string(frame.pixelPtr(0, y), frame.pixelPtr(0, y) + 9) + std::string(3, '\0');
    EXPECT_EQ(TempFolder::read(name), wanted);
}

TEST(QvImageSave, FailuresLeaveNothing) {
    const TempFolder folder;
    QvFrame frame = noiseFrame(BGR3, 300, 200, 0, 1);
    for (int format : {QvImage::bmp, QvImage::png}) {
        EXPECT_EQ(QvImage::saveFrame(frame, narrow(folder.file("no/folder")), format), QvStatus::failed);
        EXPECT_EQ(QvImage::saveFrame(frame, Any("/dev/full"), format), QvStatus::failed);
        EXPECT_TRUE(std::filesystem::exists("/dev/full"));
    }
    // Without the module that converts nothing is opened; a picture without pixels is no PNG.
    const std::string name = folder.file("none.png");
    for (const QvFrame& none : {noiseFrame(YUY2, 8, 8, 0, 1), noiseFrame(BGR3, 0, 0, 0, 1)}) {
        EXPECT_EQ(QvImage::saveFrame(none, narrow(name), QvImage::png), QvStatus::failed);
        EXPECT_FALSE(std::filesystem::exists(name));
    }
}

}  // namespace
