#include "plugins/av/picture/pictureform.h"

#include <gtest/gtest.h>

#include "core/caption/cc/qvcc.h"
#include "core/measure/fourcc.h"
#include "core/measure/mediatime.h"
#include "core/media/qvframe.h"
#include "plugins/av/picture/picturecaptions.h"
#include "tests/support/engine.h"

namespace {

TEST(PictureForm, isTheNearestThatTheEngineHas) {
    const struct {
        AVPixelFormat layout;
        bool full;
        unsigned fourcc;
        AVPixelFormat from;
        int shift;
        bool converted;
    } cases[] = {
        {AV_PIX_FMT_YUV420P, false, QvFourcc::I420, AV_PIX_FMT_YUV420P, 0, false},
        {AV_PIX_FMT_YUV420P, true, QvFourcc::I420, AV_PIX_FMT_YUV420P, 0, true},
        {AV_PIX_FMT_YUVJ420P, true, QvFourcc::I420, AV_PIX_FMT_YUV420P, 0, true},
        {AV_PIX_FMT_YUVA420P, false, QvFourcc::I420, AV_PIX_FMT_YUV420P, 0, true},
        {AV_PIX_FMT_NV12, false, QvFourcc::I420, AV_PIX_FMT_YUV420P, 0, true},
        {AV_PIX_FMT_YUV410P, false, QvFourcc::I420, AV_PIX_FMT_YUV420P, 0, true},
        {AV_PIX_FMT_GRAY8, false, QvFourcc::I420, AV_PIX_FMT_YUV420P, 0, true},
        {AV_PIX_FMT_YUV420P10LE, false, QvFourcc::W016, AV_PIX_FMT_YUV420P10LE, 6, false},
        {AV_PIX_FMT_YUV420P12LE, false, QvFourcc::W016, AV_PIX_FMT_YUV420P12LE, 4, false},
        {AV_PIX_FMT_YUV420P10BE, false, QvFourcc::W016, AV_PIX_FMT_YUV420P10LE, 6, true},
        {AV_PIX_FMT_P010LE, false, QvFourcc::W016, AV_PIX_FMT_YUV420P10LE, 6, true},
        {AV_PIX_FMT_GRAY16LE, false, QvFourcc::W016, AV_PIX_FMT_YUV420P16LE, 0, true},
        {AV_PIX_FMT_YUV422P, false, QvFourcc::YUYV, AV_PIX_FMT_YUV422P, 0, false},
        {AV_PIX_FMT_YUYV422, false, QvFourcc::YUYV, AV_PIX_FMT_YUYV422, 0, false},
        {AV_PIX_FMT_UYVY422, false, QvFourcc::YUYV, AV_PIX_FMT_YUYV422, 0, true},
        {AV_PIX_FMT_YUV411P, false, QvFourcc::YUYV, AV_PIX_FMT_YUYV422, 0, true},
        {AV_PIX_FMT_YUV422P10LE, false, QvFourcc::Y216, AV_PIX_FMT_YUV422P10LE, 6, false},
        {AV_PIX_FMT_YUV422P16LE, false, QvFourcc::Y216, AV_PIX_FMT_YUV422P16LE, 0, false},
        {AV_PIX_FMT_YUV444P, false, QvFourcc::BGR4, AV_PIX_FMT_BGRA, 0, true},
        {AV_PIX_FMT_PAL8, false, QvFourcc::BGRA, AV_PIX_FMT_BGRA, 0, true},
        {AV_PIX_FMT_BGRA, false, QvFourcc::BGRA, AV_PIX_FMT_BGRA, 0, false},
        {AV_PIX_FMT_RGB24, true, QvFourcc::BGR4, AV_PIX_FMT_BGRA, 0, true},
        {AV_PIX_FMT_GBRP12LE, false, QvFourcc::b64a, AV_PIX_FMT_BGRA64LE, 0, true},
        {AV_PIX_FMT_XYZ12LE, false, QvFourcc::b64a, AV_PIX_FMT_BGRA64LE, 0, true},
        {AV_PIX_FMT_VAAPI, false, 0, AV_PIX_FMT_NONE, 0, false},
    };
    for (const auto& c : cases) {
        const av::PictureForm form = av::formOf(c.layout, c.full);
        SCOPED_TRACE(av_get_pix_fmt_name(c.layout));
        EXPECT_EQ(form.fourcc, c.fourcc);
        EXPECT_EQ(form.from, c.from);
        EXPECT_EQ(form.shift, c.shift);
        EXPECT_EQ(!form.lost.empty(), c.converted) << form.lost;
    }
}

// A picture whose samples say where they are: plane, row and column.
av::FramePtr marked(AVPixelFormat layout, int width, int height) {
    av::FramePtr frame(av_frame_alloc());
    frame->format = layout;
    frame->width = width;
    frame->height = height;
    EXPECT_EQ(av_frame_get_buffer(frame.get(), 0), 0);
    const bool words = av_pix_fmt_desc_get(layout)->comp[0].depth > 8;
    const AVPixFmtDescriptor& row = *av_pix_fmt_desc_get(layout);
    for (int plane = 0; plane < 3; ++plane) {
        const int w = plane ? AV_CEIL_RSHIFT(width, row.log2_chroma_w) : width;
        const int h = plane ? AV_CEIL_RSHIFT(height, row.log2_chroma_h) : height;
        for (int y = 0; y < h; ++y)
            for (int x = 0; x < w; ++x) {
                auto* const at = frame->data[plane] + y * frame->linesize[plane];
                const int value = 64 * plane + 8 * y + x;
                if (words)
                    reinterpret_cast<std::uint16_t*>(at)[x] = static_cast<std::uint16_t>(value);
                else
                    at[x] = static_cast<std::uint8_t>(value);
            }
    }
    return frame;
}

TEST(FormWriter, putsEachSampleToItsPlace) {
    const EngineScope engine;
    for (const int width : {6, 7}) {
        for (const AVPixelFormat layout :
             {AV_PIX_FMT_YUV420P10LE, AV_PIX_FMT_YUV422P, AV_PIX_FMT_YUV422P10LE}) {
            SCOPED_TRACE(av_get_pix_fmt_name(layout));
            const av::PictureForm form = av::formOf(layout, false);
            QvFrame to;
            ASSERT_EQ(to.init(form.fourcc, width, 4), 0);
            av::FormWriter writer(form, width, 4);
            ASSERT_TRUE(writer.write(*marked(layout, width, 4), to));
            const auto at = [&](int plane, int y, int x) {
                const unsigned char* const row = to.plane(plane) + y * to.stride(plane);
                return layout == AV_PIX_FMT_YUV422P ? int{row[x]}
                                                    : (row[2 * x] | row[2 * x + 1] << 8) >> form.shift;
            };
            for (int y = 0; y < 4; ++y)
                for (int x = 0; x < width; ++x) {
                    const bool planes = form.fourcc == QvFourcc::W016;
                    EXPECT_EQ(at(0, y, planes ? x : 2 * x), 8 * y + x);
                    if (!planes) {
                        EXPECT_EQ(at(0, y, 2 * x + 1), 64 * (1 + x % 2) + 8 * y + x / 2);
                    }
                    if (planes && y < 2 && x < width / 2) {
                        EXPECT_EQ(at(1, y, x), 64 + 8 * y + x);
                        EXPECT_EQ(at(2, y, x), 128 + 8 * y + x);
                    }
                }
        }
    }
}

TEST(PictureCaptions, areThePairsThatAreValid) {
    const EngineScope engine;
    QvFrame to;
    ASSERT_EQ(to.init(QvFourcc::I420, 16, 16), 0);
    const av::FramePtr picture(av_frame_alloc());
    const std::uint8_t block[] = {0xFC, 0x94, 0x2C, 0xF8, 1, 2, 0xFD, 0x80, 0x80, 0xFF, 5, 6, 0xFE};
    AVFrameSideData* const data = av_frame_new_side_data(picture.get(), AV_FRAME_DATA_A53_CC, sizeof block);
    ASSERT_TRUE(data);
    std::copy(std::begin(block), std::end(block), data->data);
    const MediaTime time(3, QvRatio(25, 1), MediaTime::defaultTimescale);
    av::carryCaptions(*picture, time, to);
    QvCcData captions;
    ASSERT_TRUE(to.subpic());
    ASSERT_EQ(captions.restore(*to.subpic()), 0);
    ASSERT_EQ(captions.count(), 3);
    EXPECT_EQ(captions.at(0), QvCcBytePair(time, QvCcBytePair::field1, 0x94, 0x2C, true));
    EXPECT_EQ(captions.at(1), QvCcBytePair(time, QvCcBytePair::field2, 0x80, 0x80, true));
    EXPECT_EQ(captions.at(2), QvCcBytePair(time, QvCcBytePair::dtvccStart, 5, 6, true));
    av::carryCaptions(*av::FramePtr(av_frame_alloc()), time, to);
    EXPECT_FALSE(to.subpic());
}

}  // namespace
