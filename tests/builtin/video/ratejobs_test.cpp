// Captions of an SCC file through links that change the rate.
#include <gtest/gtest.h>

#include <cmath>
#include <vector>

#include "builtin/decoders/sccdec.h"
#include "core/caption/qvcc.h"
#include "core/engine/init.h"
#include "core/filter/filtersstate.h"
#include "core/filter/jobdescription.h"
#include "core/filter/qvprocesspipe.h"
#include "core/filter/qvprocessutil.h"
#include "core/transcode/translink.h"
#include "tests/support/fake_streams.h"
#include "tests/support/temp_folder.h"

namespace {

// Keeps the words that the frames bring, and the time of the frame that brought each.
class CaptionPipe : public FakeEncodePipe {
  public:
    using FakeEncodePipe::FakeEncodePipe;
    int writeFrame(QvFrame* frame, int stream) override {
        if (frame && frame->subpic()) {
            QvCcData captions;
            EXPECT_EQ(captions.restore(*frame->subpic()), 0);
            for (const auto& pair : captions.pairs()) {
                words.push_back(pair.byte1 << 8 | pair.byte2);
                times.push_back(
                    MediaTime(frame->frameNr, frame->framerate, MediaTime::defaultTimescale).seconds());
            }
        }
        return FakeEncodePipe::writeFrame(frame, stream);
    }
    std::vector<int> words;
    std::vector<double> times;
};

class RateJobs : public testing::Test {
  protected:
    RateJobs() { init_wrapper(nullptr); }
    ~RateJobs() override { cleanup_wrapper(); }

    // Words at the frames 10, 17, 24, ... of 29.97.
    void openCaptions(SccDec& captions) {
        std::string lines = "Scenarist_SCC V1.0\n\n";
        for (int i = 0; i < wordCount; ++i)
            lines +=
                Any::sprintf("00:00:%02d:%02d\t%04x\n\n", frameOf(i) / 30, frameOf(i) % 30, firstWord + i)
                    .asString();
        captions.init();
        captions.setParam("filename", folder.write("a.scc", lines).c_str());
        ASSERT_EQ(captions.open(), 0);
    }

    static constexpr int wordCount = 15, firstWord = 0x9420;
    static int frameOf(int word) { return 10 + 7 * word; }
    TempFolder folder;
};

}  // namespace

TEST_F(RateJobs, CaptionsArriveOnceInOrderAndInTime) {
    QvFramerate i59 = QvFramerate::f59i(), i59Bottom = i59;
    i59Bottom.setInterlaced(2);
    const struct {
        QvFramerate in, out;
        const char* filter;
        int converters;
    } rows[] = {
        {QvFramerate::f59p(), QvFramerate::f29p(), nullptr, 1},
        {QvFramerate::f29p(), QvFramerate::f59p(), nullptr, 1},
        {QvFramerate::f59p(), i59, nullptr, 1},
        {QvFramerate::f60p(), i59Bottom, nullptr, 2},
        {QvFramerate::f23p(), i59, nullptr, 1},
        {QvFramerate::f24p(), i59, nullptr, 2},
        {QvFramerate::f50p(), QvFramerate::f24p(), nullptr, 1},
        {i59, QvFramerate::f59p(), "bobber", 0},
    };
    for (const auto& row : rows) {
        SccDec captions;
        openCaptions(captions);
        const int frames = static_cast<int>(4 * row.in.rate().ratio());
        FakeDecoder decoder(frames, row.in);
        CaptionPipe pipe(row.out);
        TransVLink link;
        AnyDict params;
        if (row.filter) {
            FiltersState state;
            state.appendFilter(row.filter, AnyDict("name", row.filter, "_on", 1));
            params.set("effects", state);
        }
        ASSERT_EQ(link.init(&decoder, 0, &pipe, 0), 0);
        ASSERT_EQ(link.addMetaSource(&captions, 4, 0, {}), 0);
        ASSERT_EQ(link.open(&params), 0);
        int converters = 0;
        while (link.filter("frconvert", converters)) ++converters;
        EXPECT_EQ(converters, row.converters) << "on the way to " << row.out.rate().ratio();
        while (!link.finished()) ASSERT_EQ(link.processFrame(0), 0);

        ASSERT_EQ(pipe.words.size(), std::size_t{wordCount}) << row.in.rate().ratio();
        const double late = 1 / row.in.rate().ratio() + 1 / row.out.rate().ratio();
        for (int i = 0; i < wordCount; ++i) {
            EXPECT_EQ(pipe.words[static_cast<std::size_t>(i)], firstWord + i);
            EXPECT_NEAR(pipe.times[static_cast<std::size_t>(i)], frameOf(i) * 1001 / 30000.0, late)
                << row.in.rate().ratio() << " " << i;
        }
        const std::vector<int>& numbers = pipe.video.numbers;
        EXPECT_EQ(numbers.size(), static_cast<std::size_t>(link.totalOutFrames()));
        for (std::size_t i = 0; i < numbers.size(); ++i) ASSERT_EQ(numbers[i], static_cast<int>(i));
    }
}

TEST_F(RateJobs, TheChainCountsTheBobbersShare) {
    const struct {
        QvFramerate out;
        int front, outHeight;
        const char* chain;
    } rows[] = {
        {QvFramerate::f50p(), 1, 48, "bobber"},
        {QvFramerate::f50p(), 0, 48, "bobber"},
        // No field is dropped, though half the lines would do.
        {QvFramerate::f50p(), 1, 24, "bobber scaler"},
        {QvFramerate::f50p(), 0, 24, "scaler bobber"},
        {QvFramerate::f25p(), 1, 24, "bobber frconvert scaler"},
        {QvFramerate::f59p(), 1, 24, "bobber scaler frconvert"},
        {QvFramerate::f25p(), 0, 48, "frconvert bobber"},
    };
    for (const auto& row : rows) {
        VideoJobDescription job;
        job.inWidth = job.outWidth = 64;
        job.inHeight = 48;
        job.outHeight = row.outHeight;
        job.inFOURCC = job.outFOURCC = QvFourcc::I420;
        job.inFramerate = QvFramerate::f50i();
        job.outFramerate = row.out;
        FiltersState state;
        state.appendFilter("bobber", AnyDict("name", "bobber", "_on", 1, "_front", row.front));
        job.filters = state;
        const std::unique_ptr<QvVProcessPipe> pipe(QvProcessUtil::createVideoPipe(job));
        std::string chain;
        for (int i = 0; i < pipe->nrFilters(); ++i)
            chain += (i ? " " : "") + std::string(pipe->filter(i)->name());
        EXPECT_EQ(chain, row.chain);
        int written = 0;
        for (int n = 0; n < 50; ++n) {
            QvFrame frame;
            frame.init(QvFourcc::I420, 64, 48);
            frame.setBlack();
            frame.framerate = job.inFramerate;
            frame.frameNr = n;
            EXPECT_EQ(pipe->write(frame), 0);
            for (; pipe->process(nullptr, 0) == 0; pipe->next()) {
                EXPECT_EQ(pipe->frame()->frameNr, written++);
                EXPECT_NEAR(pipe->frame()->framerate.rate(), row.out.rate().ratio(), 1e-6);
                EXPECT_EQ(pipe->frame()->framerate.interlaced(), 0);
            }
        }
        EXPECT_NEAR(written, 2 * row.out.rate().ratio(), 1) << chain;
        pipe->close();
    }
}
