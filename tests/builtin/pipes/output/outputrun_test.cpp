#include "builtin/pipes/output/outputrun.h"

#include "builtin/pipes/output/streambuilder.h"
#include "tests/builtin/pipes/output/output_parts.h"

namespace {

TEST_F(OutputParts, ADisabledStreamIsNotOpenedButClosed) {
    TempFolder folder;
    preset_.set(anyMuxer());
    end_.setSink("filesink");
    end_.put(MuxerPlace::newMuxer("rawmux"));
    end_.attach();
    end_.setFilename(Any(folder.file("x.raw").c_str()));
    preset_.follow(end_.muxer());
    StreamBuilder builder(streams_, end_, preset_, host_);
    builder.addDefault(qvVideoStream);
    builder.addDefault(qvAudioStream);
    streams_[0].setEnabled(false);
    OutputRun run(streams_, end_, host_);
    EXPECT_EQ(run.open(false), 0) << host_.lastFailure();
    EXPECT_EQ(run.finish(false), 0);
    EXPECT_EQ(outputs_.calls, (Texts{"filesink.open", "rawmux.open", "rawaenc.open", "rawvenc.close",
                                     "rawaenc.close", "rawmux.close", "filesink.close"}));
    builder.removeAll(qvAllStreams);
}

}  // namespace
