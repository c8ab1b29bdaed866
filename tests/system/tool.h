// What the tests of the tool share: a folder to work in, the tool run in it, inputs, what a run left.
#pragma once

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cstring>
#include <filesystem>
#include <initializer_list>
#include <set>
#include <string>
#include <vector>

#include "tests/support/process.h"
#include "tests/support/temp_folder.h"
#include "tests/support/wav_bytes.h"

using Words = std::vector<std::string>;

inline Words operator+(Words a, const Words& b) {
    a.insert(a.end(), b.begin(), b.end());
    return a;
}

class Tool : public testing::Test {
  protected:
    static std::string program() { return QV_BINARY_DIR "/bin/tarsel"; }

    ProcessOptions here() const {
        ProcessOptions options;
        options.folder = folder.path().string();
        return options;
    }
    static Words words(const Words& arguments) { return Words{program()} + arguments; }
    Outcome tarsel(const Words& arguments) const { return runProgram(words(arguments), here()); }
    Outcome tarsel(const Words& arguments, const ProcessOptions& options) const {
        return runProgram(words(arguments), options);
    }

    // A run that must do its work.
    Outcome works(const Words& arguments) const {
        Outcome o = tarsel(arguments);
        EXPECT_EQ(o.status, 0) << o.err << testing::PrintToString(arguments);
        return o;
    }

    // A run that must fail with this status and one line with all of `parts`, and leave the folder as it was.
    void fails(int status, const Words& arguments, const Words& parts) const {
        failsAs(status, tarselBetween(arguments), parts, testing::PrintToString(arguments));
    }
    void failsAs(int status, const Outcome& o, const Words& parts, const std::string& what) const {
        EXPECT_EQ(o.status, status) << what << o.err;
        EXPECT_EQ(std::count(o.err.begin(), o.err.end(), '\n'), 1) << what << o.err;
        EXPECT_EQ(o.err.rfind("tarsel: ", 0), 0u) << o.err;
        EXPECT_THAT(o.err, testing::Not(testing::HasSubstr(".tarsel-"))) << "a hidden name";
        for (const auto& part : parts) EXPECT_THAT(o.err, testing::HasSubstr(part)) << what;
    }

    std::set<std::string> listing() const {
        std::set<std::string> names;
        for (const auto& entry : std::filesystem::recursive_directory_iterator(folder.path()))
            names.insert(std::filesystem::relative(entry.path(), folder.path()).string());
        return names;
    }
    std::string contents(const std::string& name) const { return TempFolder::read(folder.file(name)); }
    long long size(const std::string& name) const {
        std::error_code error;
        const auto bytes = std::filesystem::file_size(folder.file(name), error);
        return error ? -1 : static_cast<long long>(bytes);
    }

    // A WAV file of `samples` samples that differ from place to place.
    std::string makeWav(const std::string& name, unsigned samples, unsigned channels = 2, unsigned bits = 16,
                        unsigned rate = 44100) const {
        return folder.write(name,
                            riff(wavChunk("fmt ", wavFormat(1, channels, rate, bits)) +
                                 wavChunk("data", patternBytes(size_t{samples} * channels * bits / 8))));
    }
    // `frames` I420 frames of 64x48 that all differ.
    static constexpr size_t kFrame = 64 * 48 * 3 / 2;
    std::string makeYuv(const std::string& name, double frames) const {
        return folder.write(name, patternBytes(static_cast<size_t>(frames * static_cast<double>(kFrame))));
    }
    static Words asYuv(const Words& arguments) {
        return arguments + Words{"--raw", "size=64x48,pixel=I420,rate=25"};
    }

    // Each of these parts of "clip.yuv" is taken as it is there.
    struct Part {
        Words points;
        size_t first, count;  // frames
    };
    void takesParts(std::initializer_list<Part> parts) const {
        const std::string clip = contents("clip.yuv");
        for (const Part& part : parts) {
            SCOPED_TRACE(testing::PrintToString(part.points));
            const Outcome o = works(asYuv({"transcode", "clip.yuv", "-o", "part.yuv", "-y"}) + part.points);
            EXPECT_TRUE(clip.substr(part.first * kFrame, part.count * kFrame) == contents("part.yuv"));
            EXPECT_THAT(o.err, testing::HasSubstr(", " + std::to_string(part.count) + " frame"));
        }
    }

    // The job with each of these options is wrong use.
    struct Refusal {
        Words options, parts;
    };
    void refuses(const Words& job, std::initializer_list<Refusal> rows) const {
        for (const Refusal& row : rows) fails(2, job + row.options, row.parts);
    }

    TempFolder folder;

  private:
    Outcome tarselBetween(const Words& arguments) const {
        const auto before = listing();
        const Outcome o = tarsel(arguments);
        EXPECT_EQ(listing(), before) << testing::PrintToString(arguments);
        return o;
    }
};

// The chunk of a WAV file, without its head.
inline std::string wavPart(const std::string& file, const std::string& id) {
    for (size_t at = 12; at + 8 <= file.size();) {
        unsigned size = 0;
        std::memcpy(&size, &file[at + 4], 4);
        if (file.compare(at, 4, id) == 0) return file.substr(at + 8, size);
        at += 8 + size + size % 2;
    }
    return "";
}
