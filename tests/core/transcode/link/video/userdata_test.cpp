// User data of pictures on their way from a decoder through a chain to an encoder.
#include "core/filter/userdatacallback.h"
#include "core/media/qvuserdata.h"
#include "core/transcode/link/video/transvlink.h"
#include "tests/support/checks.h"
#include "tests/support/engine.h"
#include "tests/support/fake_streams.h"

namespace {

// Frame n has the packet "n", if it was asked for.
class DataDecoder : public FakeDecoder {
  public:
    using FakeDecoder::FakeDecoder;
    int setReadUserData(int, int, bool on) override { return reads = on, 0; }
    bool readUserData(int, int) const override { return reads; }
    int readFrame(int stream) override {
        if (const int result = FakeDecoder::readFrame(stream)) return result;
        packets.clear();
        frame.clearUserData();
        if (!reads) return 0;
        const std::string text = std::to_string(frame.frameNr);
        packets.append({reinterpret_cast<const unsigned char*>(text.data()), text.size()});
        frame.setUserData(&packets);
        return 0;
    }
    bool reads = false;
    QvUserData packets;
};

std::string textOf(const QvFrame& frame) {
    std::string text;
    for (int i = 0; frame.userData() && i < frame.userData()->count(); ++i) {
        const auto packet = frame.userData()->packet(i);
        text += (text.empty() ? "" : "+") + std::string(packet.begin(), packet.end());
    }
    return text;
}

class DataPipe : public FakeEncodePipe {
  public:
    using FakeEncodePipe::FakeEncodePipe;
    int writeFrame(QvFrame* frame, int) override {
        if (!written.empty()) written += ' ';
        written += textOf(*frame).empty() ? "-" : textOf(*frame);
        return 0;
    }
    std::string written;
};

struct Job {
    Job(const QvFramerate& in, const QvFramerate& out, int width = 16) : decoder(6, in), pipe(out, width) {
        pipe.video.params.set("takesUserData", 1);
    }
    std::string run() {
        EXPECT_EQ(link.init(&decoder, 0, &pipe, 0), 0);
        EXPECT_EQ(link.open(params.empty() ? nullptr : &params), 0) << link.errorDesc();
        decoder.seek(link.inPoint(), 1, 0);
        for (int i = 0; i < 100 && !link.finished(); ++i) EXPECT_EQ(link.processFrame(0), 0);
        link.close();
        return pipe.written;
    }
    EngineScope engine;
    DataDecoder decoder;
    DataPipe pipe;
    TransVLink link;
    AnyDict params;
};

TEST(UserDataPath, EachPacketReachesTheEncoderOnce) {
    const QvFramerate f24 = QvFramerate::f24p(), f25 = QvFramerate::f25p(), f50 = QvFramerate::f50p(),
                      i25 = QvFramerate::f50i(), i30 = QvFramerate::f60i();
    const struct {
        const char* what;
        QvFramerate in, out;
        int width;
        const char* written;
    } rows[] = {
        {"straight", f25, f25, 16, "0 1 2 3 4 5"},
        {"scaled", f25, f25, 32, "0 1 2 3 4 5"},
        {"repeated frames have none", f25, f50, 16, "0 - 1 - 2 - 3 - 4 - 5 -"},
        {"dropped frames pass theirs on", f50, f25, 16, "0 1+2 3+4"},
        {"woven frames have both", f50, i25, 16, "0+1 2+3 4+5"},
        {"pulldown", f24, i30, 16, "0 1 2 - 3 4 5"},
    };
    for (const auto& row : rows) EXPECT_EQ(Job(row.in, row.out, row.width).run(), row.written) << row.what;
}

// A decoder reads user data only for those who want them.
TEST(UserDataPath, SourcesReadThemOnRequest) {
    Job nobody(QvFramerate::f25p(), QvFramerate::f25p());
    nobody.pipe.video.params.remove("takesUserData");
    EXPECT_EQ(nobody.run(), "- - - - - -");
    EXPECT_FALSE(nobody.decoder.reads);

    Job filter(QvFramerate::f25p(), QvFramerate::f25p());
    filter.pipe.video.params.remove("takesUserData");
    std::string seen;
    const QvUserDataCallback note = [](void* to, QvFrame& frame) {
        *static_cast<std::string*>(to) += textOf(frame);
    };
    const AnyDict pointers("callback", Any(reinterpret_cast<const void*>(note)), "context",
                           Any(static_cast<const void*>(&seen)));
    const AnyDict state("name", "userdata", "_on", 1, "_position", 1, "state", pointers);
    filter.params.set("effects", AnyDict("customFilters", AnyVector(Any(state))));
    EXPECT_EQ(filter.run(), "0 1 2 3 4 5");
    EXPECT_EQ(seen, "012345");
}

}  // namespace
