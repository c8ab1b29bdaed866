// What has to wait for what, and what a task writes.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tarsel/batch/order.h"
#include "tests/support/temp_folder.h"

namespace {

using Names = std::vector<std::string>;
namespace fs = std::filesystem;

BatchTask task(const Names& inputs, const std::string& output, bool enabled = true) {
    BatchTask one;
    one.inputs = inputs;
    one.output = output;
    one.enabled = enabled;
    return one;
}

// "0> 1" for a task that waits for what task 0 makes and until 1 has read what it writes.
std::string waits(const std::vector<BatchTask>& tasks) {
    std::string text;
    const auto order = orderOf(tasks);
    for (const Before& before : order.back())
        text += (text.empty() ? "" : " ") + std::to_string(before.task) + (before.gives ? ">" : "");
    return text;
}

TEST(Order, ATaskWaitsForItsInputsAndForTheReadersOfItsOutput) {
    const struct {
        std::vector<BatchTask> tasks;
        const char* want;  // of the last one
    } cases[] = {
        {{task({"/i"}, "/a"), task({"/i"}, "/b")}, ""},
        {{task({"/i"}, "/a"), task({"/a"}, "/b")}, "0>"},
        {{task({"/i"}, "/a"), task({"/j"}, "/b"), task({"/b", "/a"}, "/c")}, "1> 0>"},
        {{task({"/i"}, "/a"), task({"/a"}, "/b"), task({"/b"}, "/c")}, "1>"},
        // Only earlier ones, and enabled ones.
        {{task({"/b"}, "/a"), task({"/i"}, "/b")}, "0"},
        {{task({"/i"}, "/a", false), task({"/a"}, "/b")}, ""},
        {{task({"/b"}, "/a", false), task({"/i"}, "/b")}, ""},
        {{task({"/a"}, "/a")}, ""},
        // Pictures with numbers, and sound next to a picture.
        {{task({"/i"}, "/p/c_%04d.png"), task({"/p/c_0007.png"}, "/b")}, "0>"},
        {{task({"/i"}, "/p/c_%04d.png"), task({"/p/d_0007.png"}, "/b")}, ""},
        {{task({"/i"}, "/p/c_%04d.png"), task({"/q/c_0007.png"}, "/b")}, ""},
        {{task({"/i"}, "/p/c.png"), task({"/p/c#0001.png"}, "/b")}, "0>"},
        {{task({"/i"}, "/p/c.yuv"), task({"/p/c.wav"}, "/b")}, "0>"},
        {{task({"/i"}, "/p/c.wav"), task({"/p/c.yuv"}, "/b")}, ""},
        {{task({"/i"}, "/dev/null"), task({"/i"}, "/dev/null")}, ""},
        {{task({"/i"}, ""), task({"/i"}, "")}, ""},
    };
    for (size_t i = 0; i < std::size(cases); ++i) EXPECT_EQ(waits(cases[i].tasks), cases[i].want) << i;
}

TEST(Order, LinksOfFoldersAreOnePlace) {
    const TempFolder folder;
    fs::create_directory(folder.path() / "real");
    fs::create_directory_symlink("real", folder.path() / "link");
    EXPECT_EQ(waits({task({"/i"}, folder.file("real/a")), task({folder.file("link/a")}, "/b")}), "0>");
    Places places;
    BatchTask both = task({"/i"}, folder.file("link/a.yuv"));
    both.soundApart = true;
    const std::string real = (fs::canonical(folder.path()) / "real").string();
    EXPECT_THAT(places.writtenBy(both), testing::ElementsAre(real + "/a.yuv", real + "/a.wav"));
    EXPECT_THAT(places.writtenBy(task({}, "/dev/null")), testing::IsEmpty());
}

// What is worth doing again, and what is not.
TEST(Order, ATaskIsKnownByWhatItDoes) {
    const TempFolder folder;
    const std::string input = folder.write("in.wav", "sound");
    AnyDict stored("__class__", "TranscodeTask", "filename", "a.wav", "files",
                   AnyVector(AnyDict("filename", input.c_str())));
    const BatchTask first = batchTask(stored, 1, "/l");
    EXPECT_EQ(first.output, "/l/a.wav");
    const std::string key = keyOf(first);
    stored.set("enabled", false);
    EXPECT_EQ(batchTask(stored, 7, "/l").id, first.id) << "a switch and a place are no change";
    stored.set("filename", "b.wav");
    EXPECT_NE(batchTask(stored, 1, "/l").id, first.id);
    folder.write("in.wav", "sound2");
    EXPECT_NE(keyOf(first), key);
    fs::remove(input);
    EXPECT_NE(keyOf(first), key);
}

}  // namespace
