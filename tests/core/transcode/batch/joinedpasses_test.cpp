// Two passes, and coded pictures that are passed on, over several segments: an encoder that can do both.
#include <fstream>

#include "builtin/decoders/rawdec.h"
#include "builtin/encoders/rawvenc.h"
#include "core/engine/modules/builtinplugin_p.h"
#include "core/engine/modules/qvplugin.h"
#include "core/engine/modules/qvregistry.h"
#include "core/preset/qvpresetmgr.h"
#include "tests/core/transcode/batch/joinedtask.h"

namespace {

// What happened in a run.
struct Account {
    bool analyzes = false, copies = false;  // what the encoder can do
    std::vector<int> analyzed;              // levels of the pictures of the first pass
    int encoded = 0, copied = 0, decoded = 0;
};
Account account;

class CountingDecoder : public RawDecoder {
  public:
    int readFrame(int stream) override {
        ++account.decoded;
        return RawDecoder::readFrame(stream);
    }
    using RawDecoder::getParam;
    void getParam(const char* name, Any& value) const override {
        if (std::string(name) != "srParams") return RawDecoder::getParam(name, value);
        const Any file = RawDecoder::getParam("filename");
        value = Any(AnyDict("decoder_name", "rawdec", "file", file));
    }
};

class AbleEncoder : public RawVideoEnc {
  public:
    int setParam(const char* name, const Any& value) override {
        const std::string key = name;
        if (key == "firstPass") return first_ = value.isTrue(), 0;
        if (key == "meta") return 0;
        if (key == "smartRender") return smart_ = value.isTrue(), 0;
        if (key == "decoderStruct") return takeParts(value.asDict()), 0;
        return RawVideoEnc::setParam(name, value);
    }
    using RawVideoEnc::getParam;
    void getParam(const char* name, Any& value) const override {
        const std::string key = name;
        if (key == "twoPassPossible")
            value = account.analyzes ? 1 : 0;
        else if (key == "srPossible")
            value = account.copies ? 1 : 0;
        else if (key == "smartRenderingOn")
            value = smart_ ? 1 : 0;
        else
            RawVideoEnc::getParam(name, value);
    }
    int writeFrame(QvFrame* frame) override {
        if (!frame) return copyNext();
        if (first_) return account.analyzed.push_back(*frame->plane(0, false)), 0;
        ++account.encoded;
        return RawVideoEnc::writeFrame(frame);
    }

  private:
    struct Part {
        std::string file;
        int next, left;
    };
    void takeParts(const AnyDict& source) {
        parts_.clear();
        const auto add = [this](const AnyDict& part) {
            parts_.push_back(
                {part.getString("file", ""), part.get("frame0").toInt32(), part.get("nrFrames").toInt32()});
        };
        if (!source.get("join_decoder").isTrue()) return add(source);
        for (const Any& part : source.get("segments").asVector()) add(part.asDict());
    }
    // The "coded" picture of the file as it is.
    int copyNext() {
        while (!parts_.empty() && parts_.front().left == 0) parts_.erase(parts_.begin());
        if (parts_.empty()) return QvStatus::endOfStream;
        Part& part = parts_.front();
        if (!picture_.inited())
            picture_.init(QvFourcc::GRAY, RawVideoEnc::getParam("width").toInt32(),
                          RawVideoEnc::getParam("height").toInt32());
        const auto bytes = static_cast<std::streamsize>(picture_.total_bytes());
        std::ifstream file(part.file, std::ios::binary);
        file.seekg(part.next * bytes);
        if (!file.read(reinterpret_cast<char*>(picture_.plane(0, false)), bytes)) return QvStatus::failed;
        ++part.next;
        --part.left;
        ++account.copied;
        return RawVideoEnc::writeFrame(&picture_);
    }

    bool first_ = false, smart_ = false;
    std::vector<Part> parts_;
    QvFrame picture_;
};

template <class Codec>
class Module : public QvModule {
  public:
    Module(int type, const char* name) : QvModule(type, name, "of a test", name) {}
    QvCodec* create() override { return _setAttrs(new Codec); }
};

class JoinedPasses : public JoinedTask {
  protected:
    JoinedPasses() {
        account = Account();
        qv_registry()->cleanup();
        plugin_.addModule(new Module<CountingDecoder>(QvModuleType::decoder, "rawdec"));
        plugin_.addModule(new Module<AbleEncoder>(QvModuleType::videoEncoder, "rawvenc"));
        qv_registry()->addPlugin(&plugin_);
        qv_registry()->addPlugin(qvBuiltinPlugin());
        qvPresetMgr()->update();
    }
    ~JoinedPasses() override { qv_registry()->cleanup(); }

    // Parts of two films that need no conversion, or of one at another rate.
    void join(const QvFramerate& second = QvFramerate::f25p()) {
        const auto a = film("a.raw", 50, 20, QvFramerate::f25p(), width, height);
        const auto b = film("b.raw", 50, 120, second, width, height);
        const auto s = sound("s.wav", 96000, 7, 48000), r = sound("r.wav", 88200, 9, 44100);
        add(AnyVector(source(1, a, cut(0.2, 0.48)), source(2, s, cut(0.2, 0.48))), AnyVector(a, s));
        add(AnyVector(source(1, b, cut(0, 0.4)), source(2, r, cut(0, 0.4))), AnyVector(b, r));
        add(AnyVector(source(1, a, cut(1, 1.04)), source(2, s, cut(1, 1.04))), AnyVector(a, s));
    }
    struct Result {
        std::vector<int> levels, samples;
        bool operator==(const Result&) const = default;
    };
    Result runWith(const char* param) {
        const auto open = restore();
        EXPECT_TRUE(open->task) << open->error;
        if (!open->task) return {};
        QvTranscoder transcoder(open->task.get());
        transcoder.setParam("startDelay", 0);
        if (param) transcoder.setParam(param, 1);
        EXPECT_EQ(transcoder.transcode(true), 0) << transcoder.errorDesc();
        return {levels(written(".raw")), samples(wavData())};
    }
    std::string wavData() const {
        const std::string wav = written(".wav");
        return wav.size() > 80 ? wav.substr(80) : "";
    }

  private:
    QvPlugin plugin_{"able", "Codecs that can do more"};
};

std::vector<int> wantedLevels() {
    std::vector<int> all;
    for (int i = 5; i < 12; ++i) all.push_back(20 + i);
    for (int i = 0; i < 10; ++i) all.push_back(120 + i);
    all.push_back(20 + 25);
    return all;
}

TEST_F(JoinedPasses, TheFirstPassSeesWhatTheSecondWrites) {
    account.analyzes = true;
    for (const auto& rate : {QvFramerate::f25p(), QvFramerate::f24p()}) {
        join(rate);
        const Result once = runWith(nullptr);
        EXPECT_TRUE(account.analyzed.empty());
        const Result twice = runWith("twoPass");
        EXPECT_EQ(account.analyzed, twice.levels);
        EXPECT_EQ(twice.levels, once.levels);
        EXPECT_TRUE(twice.samples == once.samples);
        if (rate == QvFramerate::f25p()) {
            EXPECT_EQ(twice.levels, wantedLevels());
        }
        EXPECT_EQ(twice.samples.size(), twice.levels.size() * 1920);
        account.analyzed.clear();
        state_ = QvTaskState();
        state_.set("encoder", output(1));
    }
}

TEST_F(JoinedPasses, CodedPicturesArePassedOnFromSeamToSeam) {
    account.copies = true;
    join();
    const Result decoded = runWith(nullptr);
    EXPECT_EQ(decoded.levels, wantedLevels());
    EXPECT_EQ(account.copied, 0);
    account.decoded = account.encoded = 0;
    const Result copied = runWith("smartRender");
    EXPECT_EQ(copied.levels, decoded.levels);
    EXPECT_EQ(account.copied, 18);
    EXPECT_EQ(account.decoded + account.encoded, 0);
    EXPECT_EQ(copied.samples.size(), 18u * 1920);
    EXPECT_TRUE(copied.samples == decoded.samples);

    // A run that copies leaves nothing behind for one of the same task that encodes.
    const auto open = restore();
    ASSERT_TRUE(open->task) << open->error;
    for (const bool copies : {true, false}) {
        account = Account();
        account.copies = true;
        open->task->clearProcessParams(qvVideoStream);
        QvTranscoder transcoder(open->task.get());
        transcoder.setParam("startDelay", 0);
        transcoder.setParam("smartRender", copies);
        ASSERT_EQ(transcoder.transcode(true), 0) << transcoder.errorDesc();
        EXPECT_EQ(account.copied, copies ? 18 : 0);
        EXPECT_EQ(levels(written(".raw")), decoded.levels);
        EXPECT_TRUE(samples(wavData()) == decoded.samples);
    }
}

// A rate that is converted, and an encoder that refuses.
TEST_F(JoinedPasses, WhatHasToBeConvertedIsNotPassedOn) {
    account.copies = true;
    join(QvFramerate::f24p());
    const Result decoded = runWith(nullptr);
    EXPECT_TRUE(runWith("smartRender") == decoded);
    EXPECT_EQ(account.copied, 0);
    EXPECT_EQ(account.encoded, static_cast<int>(2 * decoded.levels.size()));
}

}  // namespace
