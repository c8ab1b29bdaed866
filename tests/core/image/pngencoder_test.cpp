#include "core/image/pngencoder_p.h"

#include <png.h>

#include <cstring>
#include <random>

#include "core/image/qvimage.h"
#include "core/media/qvframe.h"
#include "tests/core/media/frame_model.h"
#include "tests/support/checks.h"
#include "tests/support/vector_targets.h"

namespace {

struct CloseFile {
    void operator()(std::FILE* file) const { std::fclose(file); }
};

std::string packed(const QvFrame& frame, PngEncoder& encoder) {
    const TempFolder folder;
    const std::string name = folder.file("image.png");
    EXPECT_TRUE(encoder.prepare(frame.width(), frame.height()));
    encoder.take(frame);
    encoder.compress();
    std::unique_ptr<std::FILE, CloseFile> file(std::fopen(name.c_str(), "wb"));
    EXPECT_TRUE(encoder.write(file.get()));
    file.reset();
    return TempFolder::read(name);
}

// Red, green and blue of all pixels.
std::string pixelsOf(const QvFrame& frame) {
    std::string pixels;
    for (int y = 0; y < frame.height(); ++y)
        for (int x = 0; x < frame.width(); ++x) {
            const unsigned char* p = frame.pixelPtr(x, y);
            for (const int c : {2, 1, 0}) pixels += static_cast<char>(p[c]);
        }
    return pixels;
}

// What libpng makes of it, strictly.
std::string unpacked(const std::string& bytes, int width, int height) {
    png_image image{};
    image.version = PNG_IMAGE_VERSION;
    if (!png_image_begin_read_from_memory(&image, bytes.data(), bytes.size())) return image.message;
    if (image.format != PNG_FORMAT_RGB || int(image.width) != width || int(image.height) != height)
        return "another image";
    std::string pixels(PNG_IMAGE_SIZE(image), '\0');
    if (!png_image_finish_read(&image, nullptr, pixels.data(), 0, nullptr) || image.warning_or_error)
        return image.message;
    return pixels;
}

using Pixel = std::array<int, 3>;

template <class Value>
QvFrame drawn(int width, int height, const Value& value) {
    QvFrame frame;
    frame.init(QvFourcc::BGR3, width, height);
    for (int y = 0; y < height; ++y)
        for (int x = 0; x < width; ++x) {
            const Pixel pixel = value(x, y);
            for (size_t c = 0; c < 3; ++c)
                frame.pixelPtr(x, y)[c] = static_cast<unsigned char>(std::clamp(pixel[c], 0, 255));
        }
    return frame;
}

std::vector<QvFrame> kinds(int width, int height) {
    std::vector<QvFrame> frames;
    std::mt19937 random(1);
    frames.push_back(drawn(width, height, [&](int, int) {
        return Pixel{int(random() & 255), int(random() & 255), int(random() & 255)};
    }));
    frames.push_back(drawn(width, height, [&](int x, int y) {  // a slope with grain, as films have it
        const int grain = int(random() % 7);
        return Pixel{x * 200 / width + grain, y * 200 / height + grain, (x + y) / 4 % 256 + grain};
    }));
    frames.push_back(drawn(width, height, [](int x, int y) {  // letters of two colours
        const bool ink = ((x * 7 / 5) ^ (y * 3)) % 16 < 3 && y % 14 < 9;
        return ink ? Pixel{20, 30, 40} : Pixel{250, 240, 255};
    }));
    frames.push_back(drawn(width, height, [&](int x, int) {  // bars
        const int bar = x * 8 / width;
        return Pixel{bar & 1 ? 191 : 0, bar & 2 ? 191 : 0, bar & 4 ? 191 : 0};
    }));
    // Extremes side by side: differences that do not fit a byte with a sign.
    frames.push_back(drawn(width, height, [&](int, int) {
        return Pixel{random() & 1 ? 255 : 0, random() & 1 ? 255 : 0, random() & 1 ? 255 : 0};
    }));
    return frames;
}

TEST(PngEncoder, LibpngReadsThePixelsAndEveryVectorUnitWritesTheSameBytes) {
    PngEncoder encoder;
    for (const auto& [width, height] :
         {std::pair{1, 1}, {2, 3}, {5, 1}, {11, 2}, {16, 8}, {21, 97}, {33, 200}, {257, 104}}) {
        for (const QvFrame& frame : kinds(width, height)) {
            const std::string bytes = packed(frame, encoder);
            ASSERT_TRUE(unpacked(bytes, width, height) == pixelsOf(frame)) << width << 'x' << height;
            for (const auto target : machineTargets()) {
                const OnTarget on(target);
                ASSERT_TRUE(packed(frame, encoder) == bytes) << hwy::TargetName(target);
            }
        }
    }
}

TEST(PngEncoder, RowsMayBePadded) {
    PngEncoder encoder;
    const QvFrame frame = noiseFrame(QvFourcc::BGR3, 13, 9, 5, 1);
    EXPECT_TRUE(unpacked(packed(frame, encoder), 13, 9) == pixelsOf(frame));
}

// A wrong choice of filters costs far more than this.
TEST(PngEncoder, FilesAreAboutAsSmallAsThoseOfLibpng) {
    PngEncoder encoder;
    for (const QvFrame& frame : kinds(640, 360)) {
        const std::string pixels = pixelsOf(frame);
        png_image image{};
        image.version = PNG_IMAGE_VERSION;
        image.width = 640;
        image.height = 360;
        image.format = PNG_FORMAT_RGB;
        png_alloc_size_t size = PNG_IMAGE_PNG_SIZE_MAX(image);
        std::string theirs(size, '\0');
        ASSERT_TRUE(png_image_write_to_memory(&image, theirs.data(), &size, 0, pixels.data(), 0, nullptr));
        EXPECT_LE(packed(frame, encoder).size(), size + size / 10 + 200);
    }
}

TEST(PngEncoder, RefusesWhatThereIsNoMemoryFor) {
    PngEncoder encoder;
    EXPECT_FALSE(encoder.prepare(0, 5));
    EXPECT_FALSE(encoder.prepare(5, 0));
    for (int allowed = 0; allowed < 4; ++allowed) {
        NoMemory none(allowed);
        const PlatformScope scope(none);
        EXPECT_FALSE(encoder.prepare(64, 64));
        EXPECT_EQ(errno, ENOMEM);
    }
    EXPECT_TRUE(encoder.prepare(64, 64));
}

}  // namespace
