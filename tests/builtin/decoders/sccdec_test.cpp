#include "builtin/decoders/sccdec.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "core/engine/qvexception.h"
#include "core/transcode/qvtranscodetask.h"
#include "core/transcode/translink.h"
#include "tests/support/fake_streams.h"
#include "tests/support/log_capture.h"
#include "tests/support/temp_folder.h"

namespace {

constexpr char header[] = "Scenarist_SCC V1.0\n\n";

MediaTime frameTime(long long frame, const QvFramerate& rate = QvFramerate::f29p()) {
    return MediaTime(frame, rate, MediaTime::defaultTimescale);
}

class SccDecoder : public testing::Test {
  protected:
    SccDecoder() { decoder.init(); }

    std::string file(const char* name, const std::string& lines) {
        return folder.write(name, header + lines);
    }
    int open(const std::string& filename) {
        decoder.setParam("filename", filename.c_str());
        return decoder.open();
    }
    // The frames from here to the end that have captions: "3: 0 9420 1 97ae".
    std::string readAll(int most = 1000) {
        std::string text;
        for (int frame = 0; frame < most && decoder.readFrame(0) == 0; ++frame) {
            AnyDict dict;
            if (decoder.readMeta(0, 0, dict) != 0) continue;
            QvCcData data;
            EXPECT_EQ(data.restore(dict), 0);
            text += (text.empty() ? "" : "; ") + std::to_string(frame) + ":";
            for (const auto& pair : data.pairs())
                text += Any::sprintf(" %d %02x%02x", pair.type(), pair.byte1, pair.byte2).asString();
        }
        return text;
    }

    TempFolder folder;
    SccDec decoder;
    LogCapture log;
};

TEST_F(SccDecoder, ShowsTwoFieldsAsOneStream) {
    const auto one = file("a.scc", "00:00:00:02 9420 942c\n00:00:00:29 942f\n00:00:00:05 94ae\n");
    const auto two = file("b.scc", "00:00:00:02 1520\n00:00:01:01 15ae\n00:00:00:28 1520");
    ASSERT_EQ(open(one + "," + two), 0);
    EXPECT_TRUE(log.contains("Opened field 1 scc file " + one + ", fr detected as 29.97p"));
    EXPECT_EQ(decoder.nrFrames(0), 32);
    EXPECT_EQ(decoder.duration(qvSubpicStream, 0), frameTime(32));
    EXPECT_EQ(decoder.getParam("inOut").asDict(),
              AnyDict("inField1", frameTime(2), "outField1", frameTime(29), "inField2", frameTime(2),
                      "outField2", frameTime(31)));
    EXPECT_EQ(readAll(), "2: 0 9420 0 942c 1 1520; 5: 0 94ae; 28: 1 1520; 29: 0 942f; 31: 1 15ae");
    EXPECT_EQ(decoder.readFrame(0), QvStatus::endOfStream);
    EXPECT_EQ(decoder.seekToFrame(28, 0), 0);
    EXPECT_EQ(readAll(1), "0: 1 1520");
    EXPECT_EQ(decoder.seekToFrame(-1, 0), QvStatus::endOfStream);

    decoder.seekToFrame(0, 0);
    decoder.setParam("offset", frameTime(20));
    EXPECT_EQ(decoder.getSubpicParam(0, "first").asMediaTime(), frameTime(-18));
    EXPECT_EQ(decoder.getSubpicParam(0, "last").asMediaTime(), frameTime(11));
    EXPECT_EQ(readAll(), "8: 1 1520; 9: 0 942f; 11: 1 15ae");
    ASSERT_EQ(decoder.open(), 0);
    decoder.setParam("offset", 0.0);
    decoder.setParam("readRate", QvFramerate::f59p());
    EXPECT_EQ(readAll(), "4: 0 9420 0 942c 1 1520; 10: 0 94ae; 56: 1 1520; 58: 0 942f; 62: 1 15ae");
}

TEST_F(SccDecoder, OpensWhatHasCaptions) {
    const auto good = file("a.scc", "00:00:00:29 9420\n"), empty = file("b.scc", "");
    const auto drop = file("c.scc", "00:01:00;02 9420\n"), comma = file("d,e.scc", "00:00:00:25 9420\n");
    const auto alien = folder.write("f.scc", "1\n00:00:01,000\n"), few = file("g.scc", "00:00:00:05 1520");
    const auto none = folder.file("none.scc");
    const struct {
        std::string names;
        int result;
        const char* error;
    } rows[] = {
        {comma, 0, ""},
        {none + "," + good, 0, ""},
        {good + "," + empty, 0, ""},
        {empty, -9, "No input files found, exiting"},
        {drop, -9, "No input files found, exiting"},
        {none, -9, "No input files found, exiting"},
        {alien, -9, "Failed to open field 1 scc file "},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(open(row.names), row.result) << row.names;
        EXPECT_TRUE(std::string(decoder.errorDesc()).starts_with(row.error)) << row.names;
        EXPECT_EQ(decoder.nrStreams(0), row.result == 0 ? 1 : 0);
        decoder.close();
    }
    EXPECT_TRUE(log.contains("Opened empty field 2 scc file " + good + ".")) << "the name of field 1";
    EXPECT_TRUE(
        log.contains("There is no file " + none + " for the captions of field 1", QvLogMask::warning));

    decoder.setParam("dropFrameLines", 1);
    ASSERT_EQ(open(drop), 0);
    EXPECT_TRUE(decoder.getParam("framerate").asFramerate().df());
    EXPECT_EQ(readAll(3000), "1800: 0 9420");

    // The field that seems slower is read again at the rate of the other.
    ASSERT_EQ(open(few + "," + good), 0);
    EXPECT_TRUE(log.contains("Detected framerates differ, using higher one", QvLogMask::warning));
    EXPECT_EQ(readAll(), "5: 0 1520; 29: 1 9420");
    decoder.setParam("framerate", 25);
    ASSERT_EQ(open(few), 0);
    EXPECT_TRUE(decoder.getParam("framerate").asFramerate().is25p());
    for (const auto& [name, value] : {std::pair("framerate", Any(0)),
                                      {"offset", Any(1e300)},
                                      {"filenames", Any(AnyVector(1))},
                                      {"filename", Any(3)}})
        EXPECT_EQ(decoder.setParam(name, value), QvStatus::invalidParam) << name;
}

// An encoder that puts captions into its stream: what its queue deals out, fillers left out.
class CaptionEncoder : public FakeVideoEncoder {
  public:
    explicit CaptionEncoder(const QvFramerate& rate) : rate_(rate) {}

    int writeFrame(QvFrame* frame) override {
        if (written == 0) {
            const MetaProcessParams mode(params.get("ccMode").asDict());
            queue_.start(mode.doCc608(), mode.doCc708(), rate_, 0);
        }
        QvCcData captions, dealt;
        if (frame->subpic() && captions.restore(*frame->subpic()) == 0) queue_.append(captions);
        queue_.get(dealt, frameTime(written++, rate_));
        dealt.removeFillers(frameTime(1 << 20));
        for (const auto& pair : dealt.pairs())
            text +=
                Any::sprintf("%d:%d %02x%02x ", written - 1, pair.type(), pair.byte1, pair.byte2).asString();
        return 0;
    }

    std::string text;
    int written = 0;

  private:
    QvFramerate rate_;
    QvCcProcessor queue_;
};

class CaptionPipe : public FakeEncodePipe {
  public:
    explicit CaptionPipe(const QvFramerate& rate) : FakeEncodePipe(rate), encoder(rate) {}
    QvVideoEncoder* videoEncoder(int) const override { return const_cast<CaptionEncoder*>(&encoder); }
    int writeFrame(QvFrame* frame, int) override { return encoder.writeFrame(frame); }
    QvOStream* streamAt(int) const override { return const_cast<QvOStream*>(&stream_); }

    CaptionEncoder encoder;

  private:
    QvOStream stream_{1};
};

TEST_F(SccDecoder, CaptionsOfALinkedFileReachTheEncoder) {
    const auto both = file("a.scc", "00:00:00:04 9420 9421 9422\n00:00:00:29 942f\n") + "," +
                      file("b.scc", "00:00:00:05 1520 1521\n00:00:00:29 152f\n");
    const struct {
        QvFramerate video;
        const char* text;
    } rows[] = {
        // One pair of a field a frame, from the frame of the line's time on.
        {QvFramerate::f29p(), "4:0 9420 5:0 9421 5:1 1520 6:0 9422 6:1 1521 29:0 942f 29:1 152f "},
        // Two frames to one of the file, the fields take turns.
        {QvFramerate::f59p(), "8:0 9420 10:0 9421 11:1 1520 12:0 9422 13:1 1521 58:0 942f 59:1 152f "},
        // Frame 4 of the file begins behind the start of 3, frame 5 with 4.
        {QvFramerate::f23p(), "4:0 9420 4:1 1520 5:0 9421 5:1 1521 5:0 9422 24:0 942f 24:1 152f "},
    };
    for (const auto& row : rows) {
        ASSERT_EQ(open(both), 0);
        FakeDecoder video(70, row.video);
        CaptionPipe pipe(row.video);
        QvTask task;
        task.setEncoder(&pipe);
        ASSERT_GE(task.link(&video, 1, 0, 0), 0);
        MetaProcessParams mode;
        mode.setCcMode(true, false, QvCcData::a53, false, false);
        ASSERT_EQ(task.linkMeta(&decoder, qvSubpicStream, 0, 1, 0, mode), 0);
        TransLink& link = *task.getLink(0);
        ASSERT_EQ(link.open(nullptr), 0);
        ASSERT_EQ(decoder.seek(link.inPoint(), qvSubpicStream, 0), 0);
        while (!link.finished()) ASSERT_EQ(link.processFrame(0), 0);
        link.close();
        EXPECT_EQ(pipe.encoder.written, 70);
        EXPECT_EQ(pipe.encoder.text, row.text) << row.video.desc(false, false).asString();
    }
}

}  // namespace
