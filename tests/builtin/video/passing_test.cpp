// Filters that let frames pass: the raw dump and the user data callback.
#include "builtin/video/frames/dumpraw.h"
#include "builtin/video/frames/userdata.h"
#include "tests/builtin/video/effect_frames.h"

namespace {

using Dump = OpenedEffect<DumpRaw>;
using Callback = OpenedEffect<UserData>;

void countFrames(void* context, QvFrame& frame) {
    ++*static_cast<int*>(context);
    frame.plane()[0] = 77;
}

Any pointer(void* p) { return Any(static_cast<const void*>(p)); }

}  // namespace

TEST(DumpRaw, AFullDiscIsToldOnceAndFramesPass) {
    const TempFolder folder;
    const std::string name = folder.file("full.raw");
    FullDisc disc(100000);
    const PlatformScope scope(disc);
    Dump dump({{"filename", name.c_str()}});
    QvFrame frame = makePicture(QvFourcc::GRAY, 256, 256);
    EXPECT_EQ(dump.write(frame), 0);
    const LogCapture log;
    EXPECT_EQ(dump.write(frame), QvStatus::failed);
    EXPECT_EQ(dump.ready(), 1) << "the frame passes";
    EXPECT_EQ(dump.apply(frame), 0) << "it was reported once";
    EXPECT_EQ(log.count("fail to write to " + name), 2) << "in both logs";
    EXPECT_EQ(dump.close(), QvStatus::failed);
    EXPECT_EQ(dump.open() | dump.close(), 0);
    EXPECT_EQ(TempFolder::read(name), "") << "made anew";
}

TEST(UserData, EachFrameIsShownOnceAndMayBeChanged) {
    int seen = 0;
    const auto function = pointer(reinterpret_cast<void*>(&countFrames));
    Callback filter({{"context", pointer(&seen)}, {"callback", function}});
    QvFrame in = makePicture(QvFourcc::YUYV, 8, 4);
    EXPECT_EQ(filter.through(in).plane()[0], 77);
    EXPECT_EQ(seen, 1);
    EXPECT_EQ(filter.apply(in), 0);
    EXPECT_EQ(in.plane()[0], 77);
    EXPECT_EQ(seen, 2);
    EXPECT_EQ(filter.setParam("callback", Any()), 0);
    EXPECT_EQ(filter.apply(in), 0);
    EXPECT_EQ(seen, 2);
}
