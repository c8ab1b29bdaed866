// The parts of an encode pipe without the pipe: streams, end and preset, and a host that remembers failures.
#pragma once

#include "builtin/pipes/output/members/activepreset.h"
#include "builtin/pipes/output/members/muxerplace.h"
#include "builtin/pipes/output/members/outputstreams.h"
#include "builtin/pipes/output/members/pipehost.h"
#include "core/preset/qvprofile.h"
#include "tests/support/checks.h"
#include "tests/support/failing_codecs.h"
#include "tests/support/fake_streams.h"

class RememberingHost : public PipeHost {
  public:
    const char* lastFailure() const override { return text_.c_str(); }
    const void* pipe() const override { return this; }
    int setFilename(const Any& name) override {
        filename = name;
        return 0;
    }
    Any filename;
    int code = 0;

  protected:
    void storeFailure(int failed, const char* text) override {
        code = failed;
        text_ = text;
    }

  private:
    std::string text_;
};

struct OutputParts : testing::Test {
    // A built-in preset of more multiplexers than those of the catalogue have.
    static QvPreset anyMuxer() {
        return QvPreset(AnyDict("profile", QvProfile::raw, "name", "any", "custom", 0, "muxers",
                                AnyVector("rawmux", "rawavimux", "mvrawmux"), "videoCodecs",
                                AnyVector(Any("rawvenc")), "audioCodecs", AnyVector(Any("rawaenc"))));
    }
    template <class Encoder>
    Encoder& append(int type, const AnyDict& params) {
        auto encoder = std::make_unique<Encoder>();
        encoder->params = params;
        auto stream = std::make_unique<OutputStream>(type);
        auto& added = *encoder;
        stream->take(std::move(encoder));
        streams_.append(std::move(stream));
        return added;
    }

    FailingOutputs outputs_;
    RememberingHost host_;
    OutputStreams streams_;
    MuxerPlace end_{host_};
    ActivePreset preset_;
};
