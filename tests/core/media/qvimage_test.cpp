#include "core/media/qvimage.h"

#include <png.h>
#include <zlib.h>

#include <algorithm>
#include <array>
#include <memory>

#include "core/media/qvframe.h"
#include "tests/core/media/frame_model.h"
#include "tests/support/checks.h"

namespace {

using namespace QvFourcc;

// An image file in any form, made without the code under test.
struct Image {
    png_uint_32 width = 5, height = 3;
    int depth = 8, type = PNG_COLOR_TYPE_RGB, interlace = PNG_INTERLACE_NONE;
    bool transparent = false;  // entry 1 of the palette, or the key 1,1,1

    int channels() const {
        if (type == PNG_COLOR_TYPE_PALETTE) return 1;
        return (type & PNG_COLOR_MASK_COLOR ? 3 : 1) + (type & PNG_COLOR_MASK_ALPHA ? 1 : 0);
    }
    // The value of a channel, in the image's depth.
    int sample(int x, int y, int channel) const {
        return (x * 40 + y * 17 + channel * 90) % (depth >= 8 ? 256 : 1 << depth);
    }
    // What a reader of 8 bits gets: red, green, blue, alpha.
    std::array<int, 4> pixel(int x, int y) const;
    void write(const std::string& name) const;
};

std::array<int, 4> Image::pixel(int x, int y) const {
    const auto wide = [&](int value) { return depth >= 8 ? value : value * 255 / ((1 << depth) - 1); };
    const int first = sample(x, y, 0);
    if (type == PNG_COLOR_TYPE_PALETTE)
        return {first * 3 % 256, (456 - first) % 256, first, transparent && first == 1 ? 0 : 255};
    const bool colour = type & PNG_COLOR_MASK_COLOR;
    const int last = sample(x, y, channels() - 1);
    std::array<int, 4> result = {wide(first), wide(sample(x, y, colour ? 1 : 0)),
                                 wide(sample(x, y, colour ? 2 : 0)), 255};
    if (type & PNG_COLOR_MASK_ALPHA) result[3] = wide(last);
    if (transparent && first == 1) result[3] = 0;
    return result;
}

void Image::write(const std::string& name) const {
    std::unique_ptr<std::FILE, int (*)(std::FILE*)> file(std::fopen(name.c_str(), "wb"), std::fclose);
    png_structp png = png_create_write_struct(PNG_LIBPNG_VER_STRING, nullptr, nullptr, nullptr);
    png_infop info = png_create_info_struct(png);
    png_init_io(png, file.get());
    png_set_IHDR(png, info, width, height, depth, type, interlace, PNG_COMPRESSION_TYPE_DEFAULT,
                 PNG_FILTER_TYPE_DEFAULT);
    png_color palette[256];
    for (int i = 0; i < 256; ++i)
        palette[i] = {static_cast<png_byte>(i * 3), static_cast<png_byte>(200 - i), static_cast<png_byte>(i)};
    if (type == PNG_COLOR_TYPE_PALETTE) png_set_PLTE(png, info, palette, 1 << depth);
    const png_byte paletteAlpha[] = {255, 0};
    png_color_16 key{1, 1, 1, 1, 1};
    if (transparent) png_set_tRNS(png, info, paletteAlpha, 2, &key);
    png_write_info(png, info);
    if (depth < 8) png_set_packing(png);
    std::vector<std::vector<png_byte>> rows(height);
    std::vector<png_bytep> pointers;
    for (int y = 0; y < static_cast<int>(height); ++y) {
        auto& row = rows[static_cast<std::size_t>(y)];
        for (int i = 0; i < static_cast<int>(width) * channels(); ++i) {
            row.push_back(static_cast<png_byte>(sample(i / channels(), y, i % channels())));
            if (depth == 16) row.push_back(static_cast<png_byte>(i * 99));  // stripped
        }
        pointers.push_back(row.data());
    }
    png_write_image(png, pointers.data());
    png_write_end(png, info);
    png_destroy_write_struct(&png, &info);
}

TEST(QvImageLoad, EveryKindOfPng) {
    const Image images[] = {
        {.width = 1, .height = 1, .type = PNG_COLOR_TYPE_GRAY_ALPHA},
        {.width = 33, .height = 17, .type = PNG_COLOR_TYPE_RGBA, .interlace = PNG_INTERLACE_ADAM7},
        {.depth = 16, .type = PNG_COLOR_TYPE_RGBA},
        {.depth = 2, .type = PNG_COLOR_TYPE_GRAY, .transparent = true},
        {.depth = 4, .type = PNG_COLOR_TYPE_GRAY, .interlace = PNG_INTERLACE_ADAM7},
        {.depth = 2, .type = PNG_COLOR_TYPE_PALETTE, .transparent = true},
        {.width = 40, .depth = 1, .type = PNG_COLOR_TYPE_PALETTE, .interlace = PNG_INTERLACE_ADAM7},
    };
    const TempFolder folder;
    const std::string name = folder.file("image.png");
    for (const auto& image : images) {
        SCOPED_TRACE("type " + std::to_string(image.type) + " depth " + std::to_string(image.depth));
        image.write(name);
        const int width = static_cast<int>(image.width), height = static_cast<int>(image.height);
        const bool hasAlpha = (image.type & PNG_COLOR_MASK_ALPHA) || image.transparent;
        QvFrame picture, alpha, untouched;
        ASSERT_EQ(QvImage::loadFrame(picture, narrow(name), &alpha, 7), 0);
        ASSERT_TRUE(picture.four_cc() == BGR4 && alpha.inited() == hasAlpha);
        ASSERT_TRUE(picture.width() == (width + 1) / 2 * 2 && picture.height() == (height + 1) / 2 * 2);
        ASSERT_TRUE(!hasAlpha || (alpha.four_cc() == GRAY && alpha.width() == picture.width()));
        for (int y = 0; y < picture.height(); ++y)
            for (int x = 0; x < picture.width(); ++x) {
                std::array<int, 4> wanted = {0, 0, 0, 0};
                if (x < width && y < height) wanted = image.pixel(x, y);
                const unsigned char* const p = picture.pixelPtr(x, y);
                const std::array<int, 4> got = {p[2], p[1], p[0],
                                                hasAlpha ? *alpha.pixelPtr(x, y) : wanted[3]};
                ASSERT_EQ(got, wanted) << x << "," << y;
                ASSERT_EQ(p[3], 0);
            }
    }
}

TEST(QvImageLoad, ReusesAFrameThatFits) {
    const TempFolder folder;
    const std::string name = folder.file("image.png");
    Image{}.write(name);
    QvFrame picture;
    const AnyVector strides(Any(100));
    picture.init(BGR4, 6, 4, nullptr, &strides);
    picture.setRGB(1, 2, 3);
    picture.frameNr = 8;
    ASSERT_EQ(QvImage::loadFrame(picture, narrow(name)), 0);
    EXPECT_TRUE(picture.stride() == 100 && picture.frameNr == 8);
    EXPECT_EQ(*picture.pixelPtr(5, 3), 3);  // the edge keeps what it had
    EXPECT_EQ(picture.pixelPtr(0, 0)[2], Image{}.sample(0, 0, 0));
}

TEST(QvImageLoad, RefusesWhatIsNoPng) {
    const TempFolder folder;
    QvFrame picture;
    LogCapture log;
    EXPECT_EQ(QvImage::loadFrame(picture, narrow(folder.file("missing.png"))), -1);
    EXPECT_TRUE(log.contains("Can not open " + folder.file("missing.png") + " for reading"));
    log.clear();
    for (const char* bytes : {"", "\x89PNG\r\n\x1a", "\x89PNG\r\n\x1a\x0b....", "BM"})
        EXPECT_EQ(QvImage::loadFrame(picture, narrow(folder.write("none.png", bytes))), -1);
    EXPECT_EQ(QvImage::loadFrame(picture, Any(folder.path().c_str())), -1);
    EXPECT_TRUE(log.lines().empty());
    EXPECT_EQ(QvImage::loadFrame(picture, Any(5)), -1);
    EXPECT_FALSE(picture.inited());
}

TEST(QvImageLoad, SurvivesDamage) {
    const TempFolder folder;
    const std::string name = folder.file("image.png");
    const auto load = [&](const std::string& bytes) {
        QvFrame picture, alpha;
        const int result = QvImage::loadFrame(picture, narrow(folder.write("bad.png", bytes)), &alpha);
        return result == 0 && picture.inited() ? 1 : result;
    };
    Image{.width = 33, .height = 17, .type = PNG_COLOR_TYPE_RGBA, .interlace = PNG_INTERLACE_ADAM7}.write(
        name);
    const std::string whole = TempFolder::read(name);
    for (std::size_t length = 8; length < whole.size(); length += 7)
        EXPECT_GE(load(whole.substr(0, length)), 0);
    for (std::size_t at = 8; at < whole.size(); at += 5) {
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
        LogCapture log;
        EXPECT_EQ(load(huge), 0);  // and no picture
        EXPECT_TRUE(log.contains("bad.png", QvLogMask::warning));
    }
}

TEST(QvImageSave, PngComesBack) {
    const TempFolder folder;
    const std::string name = folder.file("saved.png");
    QvFrame frame = noiseFrame(BGR3, 8, 6, 5, 1), back;
    const auto before = modelOf(frame);
    ASSERT_EQ(QvImage::saveFrame(frame, narrow(name), QvImage::png), 0);
    EXPECT_EQ(modelOf(frame), before);
    const std::string bytes = TempFolder::read(name);
    EXPECT_EQ(bytes.substr(24, 5), std::string("\x08\x02\x00\x00\x00", 5));  // 8 bits, RGB, not interlaced
    ASSERT_EQ(QvImage::loadFrame(back, narrow(name)), 0);
    for (int y = 0; y < 6; ++y)
        for (int x = 0; x < 8; ++x)
            ASSERT_TRUE(std::equal(frame.pixelPtr(x, y), frame.pixelPtr(x, y) + 3, back.pixelPtr(x, y)));
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
    makeNoise(frame, BGR4, 3, 2, 0, 1);
    EXPECT_THROW(QvImage::saveFrame(frame, narrow(name), QvImage::bmp), QvAssertFailure);
}

TEST(QvImageSave, FailuresLeaveNothing) {
    const TempFolder folder;
    QvFrame frame = noiseFrame(BGR3, 300, 200, 0, 1);
    for (int format : {QvImage::bmp, QvImage::png}) {
        LogCapture log;
        EXPECT_EQ(QvImage::saveFrame(frame, narrow(folder.file("no/folder")), format), -1);
        EXPECT_TRUE(log.contains("[Save image] Can not open " + folder.file("no/folder") + " for writing."));
        EXPECT_EQ(QvImage::saveFrame(frame, Any("/dev/full"), format), -1);
        EXPECT_TRUE(log.contains("Can not write file"));
        EXPECT_TRUE(std::filesystem::exists("/dev/full"));
    }
    // Without the module that converts nothing is opened; a picture without pixels is no PNG.
    const std::string name = folder.file("none.png");
    for (const QvFrame& none : {noiseFrame(YUY2, 8, 8, 0, 1), noiseFrame(BGR3, 0, 0, 0, 1)}) {
        EXPECT_EQ(QvImage::saveFrame(none, narrow(name), QvImage::png), -1);
        EXPECT_FALSE(std::filesystem::exists(name));
    }
    EXPECT_THROW(QvImage::saveFrame(QvFrame(), narrow(name), QvImage::png), QvAssertFailure);
}

}  // namespace
