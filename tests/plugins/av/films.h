// Small films made by the ffmpeg command, and what it says are their pictures.
#pragma once

#include <algorithm>
#include <array>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "tests/support/process.h"
#include "tests/support/temp_folder.h"

class Films : public testing::Test {
  protected:
    using Words = std::vector<std::string>;

    void SetUp() override {
        if (ffmpeg({"-version"}).status != 0) GTEST_SKIP() << "there is no ffmpeg here";
    }

    static Outcome ffmpeg(const Words& arguments) {
        Words words = {"/usr/bin/env", "ffmpeg", "-nostdin", "-v", "error", "-y"};
        words.insert(words.end(), arguments.begin(), arguments.end());
        return runProgram(words);
    }
    // A film of moving pictures with those options; skips the test where ffmpeg lacks the codec.
    std::string film(const std::string& name, const Words& options,
                     const std::string& source = kMoving) const {
        const std::string file = folder.file(name);
        Words words = {"-f", "lavfi", "-i", source};
        words.insert(words.end(), options.begin(), options.end());
        words.push_back(file);
        const Outcome made = ffmpeg(words);
        EXPECT_EQ(made.status, 0) << made.err;
        return file;
    }
    // A copy of a MOV of one track with another display matrix: the quarters of its upper left corner, in the
    // order of the file.
    std::string turnedFilm(const std::string& film, const std::array<int, 4>& quarters) const {
        std::string bytes = TempFolder::read(film);
        const auto matrix = [](const std::array<int, 4>& m) {
            std::string text;
            for (const int number : {m[0] << 16, m[1] << 16, 0, m[2] << 16, m[3] << 16, 0, 0, 0, 1 << 30})
                for (int shift = 24; shift >= 0; shift -= 8) text += static_cast<char>(number >> shift);
            return text;
        };
        const std::string none = matrix({1, 0, 0, 1}), other = matrix(quarters);
        const std::size_t at = bytes.rfind(none);  // that of the film is before it
        EXPECT_NE(at, std::string::npos);
        folder.write("turned.mov", bytes.replace(std::min(at, bytes.size()), none.size(), other));
        return folder.file("turned.mov");
    }
    // Its pictures one after the other in that layout.
    std::string pictures(const std::string& film, const std::string& layout) const {
        const std::string raw = folder.file("pictures.raw");
        const Outcome read = ffmpeg({"-i", film, "-map", "0:v:0", "-f", "rawvideo", "-pix_fmt", layout,
                                     "-fps_mode", "passthrough", raw});
        EXPECT_EQ(read.status, 0) << read.err;
        return TempFolder::read(raw);
    }

    static constexpr const char* kMoving = "testsrc2=size=96x64:rate=25:duration=2";
    TempFolder folder;
};

// With the tool, which loads the plug-in by itself.
class FilmsInTheTool : public Films {
  protected:
    Outcome tarsel(Words words) const {
        words.insert(words.begin(), QV_BINARY_DIR "/bin/tarsel");
        ProcessOptions options;
        options.folder = folder.path().string();
        return runProgram(words, options);
    }
};
