// Jobs through automatic chains of the library's own filters.
#include "builtin/decoders/sccdec.h"
#include "core/caption/cc/qvcc.h"
#include "core/filter/qvfiltersetup.h"
#include "core/filter/userdatacallback.h"
#include "core/job/filtersstate.h"
#include "core/transcode/link/video/transvlink.h"
#include "core/transcode/task/qvtranscodetask.h"
#include "tests/core/filter/chains.h"
#include "tests/support/engine.h"

namespace {

using Rate = QvFramerate;

// Keeps the words that the frames bring, and the time of the frame that brought each.
class CaptionPipe : public FakeEncodePipe {
  public:
    using FakeEncodePipe::FakeEncodePipe;
    int writeFrame(QvFrame* frame, int stream) override {
        QvCcData captions;
        EXPECT_TRUE(!frame || !frame->subpic() || captions.restore(*frame->subpic()) == 0);
        for (const auto& pair : captions.pairs()) {
            words.push_back(pair.byte1 << 8 | pair.byte2);
            times.push_back(
                MediaTime(frame->frameNr, frame->framerate, MediaTime::defaultTimescale).seconds());
        }
        return FakeEncodePipe::writeFrame(frame, stream);
    }
    std::vector<int> words;
    std::vector<double> times;
};

// Words at the frames 10 to 14, 45 to 49 and 80 to 84 of 29.97: slower pictures get two at once.
constexpr int wordCount = 15, firstWord = 0x9420;
int frameOf(int word) { return 10 + word + word / 5 * 30; }

std::string captionLines() {
    std::string lines = "Scenarist_SCC V1.0\n\n";
    for (int i = 0; i < wordCount; ++i) {
        const int second = frameOf(i) / 30, frame = frameOf(i) % 30;
        lines += Any::sprintf("00:00:%02d:%02d\t%04x\n\n", second, frame, firstWord + i).asString();
    }
    return lines;
}

void countFrames(void* context, QvFrame&) { ++*static_cast<int*>(context); }

}  // namespace

TEST(ChainJobs, CaptionsArriveOnceInOrderAndInTime) {
    const EngineScope engine;
    const TempFolder folder;
    const std::string file = folder.write("a.scc", captionLines());
    const Rate i59 = Rate::f59i(), i59Bottom(i59.rate(), 2);
    const struct {
        Rate in, out;
        const char* filter;
        int converters;
    } rows[] = {
        {Rate::f59p(), Rate::f29p(), "", 1}, {Rate::f29p(), Rate::f59p(), "", 1},
        {Rate::f59p(), i59, "", 1},          {Rate::f60p(), i59Bottom, "", 2},
        {Rate::f23p(), i59, "", 1},          {Rate::f24p(), i59, "", 2},
        {Rate::f50p(), Rate::f24p(), "", 1}, {i59, Rate::f59p(), "bobber", 0},
        {Rate::f23p(), Rate::f23p(), "", 0},
    };
    for (const auto& row : rows) {
        const double in = row.in.rate().ratio(), out = row.out.rate().ratio();
        SCOPED_TRACE(testing::Message() << in << " to " << out);
        SccDec captions;
        captions.init();
        captions.setParam("filename", file.c_str());
        ASSERT_EQ(captions.open(), 0);
        FakeDecoder decoder(static_cast<int>(4 * in), row.in);
        CaptionPipe pipe(row.out);
        QvTask task;
        task.setEncoder(&pipe);
        ASSERT_EQ(task.link(&decoder, qvVideoStream, 0, 0), 0);
        MetaProcessParams mode;
        mode.setCcMode(true, false, QvCcData::a53, false, false);
        ASSERT_EQ(task.linkMeta(&captions, qvSubpicStream, 0, 1, 0, mode), 0);
        auto& link = dynamic_cast<TransVLink&>(*task.getLink(0));
        AnyDict params;
        if (*row.filter) params.set("effects", AnyDict("customFilters", AnyVector(Any(stored(row.filter)))));
        ASSERT_EQ(link.open(&params), 0);
        EXPECT_TRUE(MetaProcessParams(pipe.video.params.get("ccMode").asDict()).doCc608());
        EXPECT_EQ(link.filter("frconvert", row.converters), nullptr);
        EXPECT_TRUE(row.converters == 0 || link.filter("frconvert", row.converters - 1));
        while (!link.finished()) ASSERT_EQ(link.processFrame(0), 0);

        ASSERT_EQ(pipe.words.size(), std::size_t{wordCount});
        for (std::size_t i = 0; i < wordCount; ++i) {
            EXPECT_EQ(pipe.words[i], firstWord + static_cast<int>(i));
            EXPECT_NEAR(pipe.times[i], frameOf(static_cast<int>(i)) * 1001 / 30000.0, 1 / in + 1 / out) << i;
        }
        const std::vector<int>& numbers = pipe.video.numbers;
        EXPECT_EQ(numbers.size(), static_cast<std::size_t>(link.totalOutFrames()));
        for (std::size_t i = 0; i < numbers.size(); ++i) ASSERT_EQ(numbers[i], static_cast<int>(i));
    }
}

TEST(ChainJobs, FiltersOfASetUpDoTheirWork) {
    const EngineScope engine;
    int seen = 0;
    QvVFilterSetup setup;
    setup.addFilter("videofade", false);
    setup.addUserDataCallback(reinterpret_cast<const void*>(&countFrames), &seen, true);
    setup.setFlip(true);
    setup.setDeinterlace(QV_DEINTERLACE_BOTTOM);
    setup.setCrop(1, 64, 48, QvRect(8, 4, 56, 44), 2, 2, 4, 4);
    FiltersState state;
    setup.store(state);
    VideoJobDescription job;
    job.inWidth = 64, job.inHeight = 48, job.inFramerate = Rate::f50i();
    job.outWidth = 56, job.outHeight = 22, job.outFramerate = Rate::f25p();
    job.inFOURCC = job.outFOURCC = QvFourcc::GRAY;
    job.filters = state;
    const std::unique_ptr<QvVProcessPipe> pipe(QvProcessUtil::createVideoPipe(job));
    EXPECT_EQ(planOf(pipe, [](auto&) { return ""; }), "userdata flipper cropper deinterlace videofade");
    QvFrame in;
    in.init(QvFourcc::GRAY, 64, 48);
    for (int y = 0; y < 48; ++y)
        for (int x = 0; x < 64; ++x) *in.pixelPtr(x, y) = static_cast<unsigned char>(2 * y + x + 1);
    in.framerate = Rate::f50i();
    in.frameNr = 0;
    EXPECT_EQ(pipe->write(in), 0);
    ASSERT_EQ(pipe->process(nullptr, 0), 0);
    const QvFrame& out = *pipe->frame();
    ASSERT_EQ(out.width() * 100 + out.height(), 5622);
    EXPECT_EQ(out.framerate.interlaced(), 0);
    for (int i = 0; i < 56 * 22; ++i) {
        // Row y shows row 2 y + 1 of the padded box, which shows row 45 - (2 y + 1) of the input.
        const int x = i % 56, y = i / 56;
        const bool isPad = y == 0 || y == 21 || x < 4 || x >= 52;
        ASSERT_EQ(*out.pixelPtr(x, y), isPad ? 0 : 2 * (44 - 2 * y) + x + 5) << x << " " << y;
    }
    EXPECT_EQ(seen, 1);
}
