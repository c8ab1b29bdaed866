#include "core/encode/qvfilemux.h"

#include "core/encode/qvmuxer.h"
#include "core/engine/status.h"
#include "tests/support/checks.h"
#include "tests/support/engine.h"

namespace {

class FileMuxCheck : public testing::Test {
  protected:
    QvFileMuxStream& video(QvFileMux& mux) const {
        QvFileMuxStream& stream = mux.config().addStream(qvVideoStream, narrow(file), Any("x264"));
        stream.framerate = QvFramerate(25.0);
        return stream;
    }
    QvFileMuxStream& sound(QvFileMux& mux) const {
        QvFileMuxStream& stream = mux.config().addStream(qvAudioStream, narrow(file), Any("rawaenc"));
        stream.samplerate = 48000;
        stream.channels = 2;
        stream.bitsPerSample = 16;
        return stream;
    }

    TempFolder folder;
    std::string file = folder.write("a.bin", "0123456789");
};

TEST_F(FileMuxCheck, NamesTheStreamAndTheFileAtFault) {
    const std::string empty = folder.write("empty", "");
    using Stream = QvFileMuxStream;
    const struct {
        bool isVideo;
        std::function<void(Stream&)> change;
        std::string reason;
    } rows[] = {
        {true, [](Stream& s) { s.type = 3; }, "there is no type 3"},
        {true, [](Stream& s) { s.codec = Any(); }, "its codec is not set"},
        {true, [](Stream& s) { s.codec = Any(7); }, "its codec is not set"},
        {true, [](Stream& s) { s.framerate = QvFramerate(0.0); }, "it has no frame rate"},
        {true,
         [](Stream& s) {
             s.units = {4, 0, 6};
         },
         "unit 1 has a size of 0"},
        {true,
         [](Stream& s) {
             s.units = {-4, 14};
         },
         "unit 0 has a size of -4"},
        {true,
         [](Stream& s) {
             s.units = {4, 7};
         },
         "unit 1 of 7 bytes ends after the file's 10"},
        {true,
         [](Stream& s) {
             s.units = {5, LLONG_MAX, LLONG_MAX};
         },
         "unit 1 of 9223372036854775807 bytes ends after the file's 10"},
        {true,
         [](Stream& s) {
             s.units = {4, 5};
         },
         "the units are 9 bytes, the file has 10"},
        {true,
         [](Stream& s) {
             s.units = {4, 6};
         },
         ""},
        {false, [](Stream& s) { s.samplerate = 0; }, "0 Hz is not within 1 to 1000000"},
        {false, [](Stream& s) { s.samplerate = INT_MAX; }, "2147483647 Hz is not within 1 to 1000000"},
        {false, [](Stream& s) { s.channels = 3; }, "after the last whole sample there are 4 bytes"},
        {false, [](Stream& s) { s.channels = -1; }, "-1 channels are not within 1 to 256"},
        {false, [](Stream& s) { s.bitsPerSample = 65; }, "65 bits are not within 0 to 64"},
        {false, [](Stream& s) { s.channels = 1; }, ""},
    };
    for (const auto& row : rows) {
        QvFileMux mux;
        video(mux);
        Stream& stream = row.isVideo ? video(mux) : sound(mux);
        row.change(stream);
        EXPECT_EQ(mux.check(), row.reason.empty() ? QvStatus::ok : QvStatus::invalidArgument);
        const std::string kind = stream.type == 3 ? "Subpicture" : row.isVideo ? "Video" : "Audio";
        const std::string number =
            row.isVideo && stream.type == qvVideoStream ? " stream #1, '" : " stream #0, '";
        EXPECT_EQ(mux.errorDesc(), row.reason.empty() ? "" : kind + number + file + "': " + row.reason);
        EXPECT_EQ(mux.errorCode(), row.reason.empty() ? 0 : QvStatus::invalidArgument);
    }
    for (const auto& [name, reason] :
         {std::pair(empty, "it is empty"),
          {folder.file("missing"), "it can't be opened, or is no regular file"},
          {folder.path().string(), "it can't be opened, or is no regular file"},
          {std::string("/dev/zero"), "it can't be opened, or is no regular file"},
          {std::string(), "it can't be opened, or is no regular file"}}) {
        QvFileMux mux;
        video(mux).file = narrow(name);
        EXPECT_EQ(mux.check(), QvStatus::invalidArgument);
        EXPECT_EQ(mux.errorDesc(), "Video stream #0, '" + name + "': " + reason);
    }
    EXPECT_EQ(QvFileMux().check(), QvStatus::invalidArgument);
}

TEST_F(FileMuxCheck, RefusesWhatItCanNotRun) {
    const EngineScope engine;
    const std::string before = folder.write("out.avi", "an output of another run");
    const Any out = narrow(before);
    const auto run = [&](const char* muxer, const Any& output, const AnyDict& params = {}) {
        QvFileMux mux;
        video(mux);
        mux.config().output = params;
        EXPECT_LT(mux.run(muxer, output), 0);
        EXPECT_EQ(mux.filesWritten().size(), 0);
        return std::string(mux.errorDesc());
    };
    EXPECT_EQ(run(nullptr, out), "There is no multiplexer");
    EXPECT_EQ(run("absent", out), "There is no multiplexer absent");
    EXPECT_EQ(run("wavdec", out), "There is no multiplexer wavdec");
    EXPECT_EQ(run("memmux", out), "memmux does not multiplex files");
    EXPECT_EQ(run("rawmux", Any()), "The output has no name");
    EXPECT_EQ(run("rawmux", narrow(file)), "Video stream #0, '" + file + "': it is the output, too");
    EXPECT_EQ(run("rawmux", out, AnyDict("absent", 1)), "rawmux does not take the parameter 'absent'");
    EXPECT_EQ(run("rawavimux", out, AnyDict("segments", 0)),
              "rawavimux does not take the parameter 'segments'");
    EXPECT_EQ(TempFolder::read(file), "0123456789");

    QvFileMux many;
    for (int i = 0; i < 100; ++i) video(many);
    EXPECT_LT(many.run("rawavimux", out), 0);
    EXPECT_EQ(many.errorDesc(),
              "Video stream #99, '" + file + "': rawavimux takes no further stream of this type");
    QvFileMux text;
    text.config().addStream(qvSubpicStream, narrow(file), Any("srt"));
    EXPECT_LT(text.run("rawavimux", out), 0);
    EXPECT_EQ(text.errorDesc(),
              "Subpicture stream #0, '" + file + "': rawavimux takes no further stream of this type");
    EXPECT_EQ(TempFolder::read(before), "an output of another run");
}

}  // namespace
