// What an encoder says of the quality of its frames, as the log of a link.
#include "core/stream/auxinfoid.h"
#include "core/stream/file/qvfilebufstream.h"
#include "core/transcode/link/video/transvlink.h"
#include "tests/support/checks.h"
#include "tests/support/comma_locale.h"
#include "tests/support/engine.h"
#include "tests/support/fake_streams.h"

namespace {

using Values = std::vector<double>;

// Reports the values of each frame on its stream while statistics are on.
class MeasuringPipe : public FakeEncodePipe {
  public:
    MeasuringPipe(QvBufStream& stream, std::vector<Values> values)
        : FakeEncodePipe(QvFramerate::f25p()), stream_(stream), values_(std::move(values)) {}
    int writeFrame(QvFrame* frame, int) override {
        const auto n = static_cast<size_t>(frame->frameNr);
        bufstream* to = stream_.input();
        if (video.params.get("getQualityStats").isTrue() && n < values_.size())
            to->auxinfo(to, 0, QvAuxId::STATISTIC_INFO, values_[n].data(),
                        static_cast<unsigned>(values_[n].size() * sizeof(double)));
        unsigned bytes = 100 + static_cast<unsigned>(n);
        to->auxinfo(to, 0, QvAuxId::VIDEO_AU_CODE, &bytes, sizeof bytes);
        return 0;
    }

  private:
    QvBufStream& stream_;
    std::vector<Values> values_;
};

class QualityLogs : public testing::Test {
  protected:
    // Runs three frames with a log of each name.
    int run(std::vector<Values> values, const std::vector<std::string>& names) {
        QvFileBufStream stream;
        stream.setParam("outfilename", narrow(folder.file("coded")));
        EXPECT_EQ(stream.init(), 0);
        FakeMuxer muxer("fake", &stream);
        MeasuringPipe pipe(stream, std::move(values));
        pipe.muxer = &muxer;
        for (const Any& name : refused) pipe.video.refused.set(name.asString(), 1);
        FakeDecoder decoder(3, QvFramerate::f25p());
        TransVLink link;
        QvEncodingQualityStatsSetup setup;
        for (const std::string& name : names) setup.addLog(narrow(folder.file(name)));
        AnyDict params("qualityStats", static_cast<const AnyVector&>(setup));
        EXPECT_EQ(link.init(&decoder, 0, &pipe, 0), 0);
        EXPECT_EQ(link.open(&params), 0);
        while (!link.finished()) EXPECT_EQ(link.processFrame(0), 0);
        const int result = link.close();
        EXPECT_FALSE(pipe.video.params.get("getQualityStats").isTrue());
        return result;
    }
    std::string read(const std::string& name) const { return TempFolder::read(folder.file(name)); }

    EngineScope engine;
    TempFolder folder;
    AnyVector refused;
};

constexpr double inf = std::numeric_limits<double>::infinity();

TEST_F(QualityLogs, AreWrittenByTheirExtension) {
    const CommaLocale locale;
    run({{40, 41, 42.25, 0.9, 0.95, 1}, {inf, 41, 42, 1, 1, 1}, {30, 41, 42, 0.5, 1, 1}},
        {"a.csv", "a.json", "a.log"});
    EXPECT_EQ(read("a.csv"),
              "frame,bytes,psnr_y,psnr_u,psnr_v,ssim_y,ssim_u,ssim_v\n"
              "0,100,40.0000,41.0000,42.2500,0.9000,0.9500,1.0000\n"
              "1,101,inf,41.0000,42.0000,1.0000,1.0000,1.0000\n"
              "2,102,30.0000,41.0000,42.0000,0.5000,1.0000,1.0000\n");
    EXPECT_EQ(read("a.log").substr(0, 28), "0\t100\t40.0000\t41.0000\t42.250");
    const std::string json = read("a.json");
    EXPECT_NE(json.find("{\"frame\":1,\"bytes\":101,\"psnr_y\":null,\"psnr_u\":41.0000,"), std::string::npos)
        << json;
    // The mean error of 40, inf and 30 dB is that of 34.3573 dB.
    EXPECT_NE(json.find("\"mean\":{\"bytes\":101.0000,\"psnr_y\":34.3573,\"psnr_u\":41.0000,"),
              std::string::npos)
        << json;
    EXPECT_NE(json.find("\"ssim_y\":0.8000,\"ssim_u\":0.9833,\"ssim_v\":1.0000}}\n"), std::string::npos)
        << json;
}

TEST_F(QualityLogs, NameWhatThereIs) {
    run({{40}, {41}}, {"one.csv"});
    EXPECT_EQ(read("one.csv"), "frame,bytes,psnr_y\n0,100,40.0000\n1,101,41.0000\n2,102,\n");
    run({{40, 0.5}, {41, 0.25}, {42, 1}}, {"two.csv"});
    EXPECT_EQ(read("two.csv").substr(0, 46), "frame,bytes,psnr_y,ssim_y\n0,100,40.0000,0.5000");
    run({Values(8, 1.5)}, {"many.csv", "many.json"});
    EXPECT_EQ(read("many.csv").substr(0, 30), "frame,bytes,value1,value2,valu");
    run({}, {"none.json"});
    EXPECT_NE(read("none.json").find("\"mean\":{\"bytes\":101.0000}}"), std::string::npos);
}

TEST_F(QualityLogs, EncodersWithoutStatisticsAreNamed) {
    refused.append(Any("getQualityStats"));
    LogCapture log;
    EXPECT_EQ(run({{40}}, {"none.csv"}), 0);
    EXPECT_TRUE(log.contains("does not support PSNR logging."));
    EXPECT_EQ(read("none.csv"), "");
    refused.clear();
    run({{40}}, {"nowhere/a.csv", "here.csv"});
    EXPECT_TRUE(log.contains("Can not write quality log"));
    EXPECT_NE(read("here.csv"), "") << "the others are written";
}

}  // namespace
