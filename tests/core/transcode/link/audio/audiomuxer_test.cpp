#include "core/transcode/link/audio/audiomuxer.h"

#include "tests/support/checks.h"
#include "tests/support/fake_streams.h"

namespace {

struct NamedEncoder : FakeAudioEncoder {
    explicit NamedEncoder(const char* name) : name_(name) {}
    const char* name() const override { return name_; }
    const char* name_;
};

// As in "0+2 1 -": per output channel the inputs, "-" for none.
std::string describe(const AudioMuxer& muxer) {
    std::string text;
    for (int out = 0; out < muxer.nrOutChannels(); ++out) {
        if (out > 0) text += ' ';
        const AnyVector inputs = muxer.connectedTo(out);
        for (int i = 0; i < inputs.size(); ++i)
            text += (i > 0 ? "+" : "") + std::to_string(inputs.at(i).asInt32());
        if (inputs.empty()) text += '-';
    }
    return text;
}

std::string passthrough(const char* codec, const char* encoderName, int in, int out,
                        const AnyDict* dolby = nullptr) {
    FakeDecoder decoder(1, QvFramerate::f25p());
    decoder.audio(100, 48000, in);
    decoder.tracks.front()->params.set("codec", codec);
    if (dolby) decoder.tracks.front()->params.set("dolby", *dolby);
    NamedEncoder encoder(encoderName);
    AudioMuxer muxer;
    EXPECT_EQ(muxer.init(&decoder, &encoder, out, nullptr, -1), 0);
    return describe(muxer);
}

TEST(AudioMuxer, PassthroughByCodecs) {
    const AnyDict film("L", 0, "C", 1, "R", 2, "Ls", 3, "Rs", 4, "SUB", 5), broken("L", 0, "R", 9, "C", -3);
    const struct {
        const char* codec;
        const char* encoder;
        int in;
        std::vector<const char*> expected;  // each for as many outputs as it names
        const AnyDict* speakers = nullptr;
    } rows[] = {
        {"PCM", "rawaenc", 1, {"0 0"}},
        {"PCM", "rawaenc", 6, {"0+2+4 1+3+5"}},
        {"PCM", "ddaenc", 1, {"0 -"}},
        {"PCM", "ddproaenc", 2, {"0 0+1 1 - -"}},
        {"AAC", "ddaenc", 2, {"0 - 1 - -", "0 1 - - - -"}},
        {"AAC", "ddaenc", 4, {"0 2 1 3 3", "0 1 2 - 3 3"}},
        {"AAC", "ddaenc", 6, {"0+2 1+2", "0 2 1 3 4", "0 1 2 3 4 5"}},
        {"AAC", "aacaenc", 3, {"0+2 1+2"}},
        {"AAC", "aacaenc", 6, {"0+1+2", "0 1 2 3 4", "0 1 2 3 4 5"}},
        {"AAC", "rawaenc", 6, {"0+2 1+2", "0+4 1+5 2 3"}},
        {"Dolby", "ddaenc", 6, {"0+2+1", "0 1 2", "0 1 2 -", "0 1 2 3 4", "0 2 1 5 3 4"}, &film},
        {"Dolby", "aacaenc", 6, {"0+1 2+1", "0 2 1", "0 2 1 3+4", "0 2 1 3 4"}, &film},
        {"Dolby", "rawaenc", 6, {"0+1 2+1", "0+3 1+4 2+5", "0 1 2 3 4 5", "0 1 2 3 4 5 - -"}, &film},
        {"Dolby", "ddaenc", 2, {"0 -"}, &broken},
    };
    for (const auto& row : rows)
        for (const std::string expected : row.expected) {
            const auto outputs = static_cast<int>(std::count(expected.begin(), expected.end(), ' ')) + 1;
            EXPECT_EQ(passthrough(row.codec, row.encoder, row.in, outputs, row.speakers), expected)
                << row.codec << " " << row.in << " to " << row.encoder;
        }
    LogCapture log;
    passthrough("Dolby", "ddaenc", 6, 4, &film);
    EXPECT_TRUE(log.contains("output channel 4 >= nr of output channels 4", QvLogMask::error));
}

}  // namespace
