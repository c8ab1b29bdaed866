// A stored task for the tests of task files.
#pragma once

#include <gtest/gtest.h>

#include "core/document/xmldom.h"
#include "core/encode/qvencodepipe.h"
#include "core/transcode/batch/qvtaskfile.h"
#include "tests/support/engine.h"
#include "tests/support/temp_folder.h"
#include "tests/support/wav_bytes.h"

// The file of a task: two WAV files into raw sound.
struct TaskFile {
    TaskFile() {
        const std::string wav = folder.write("in.wav", riff(wavChunk("fmt ", wavFormat(1, 2, 48000, 16)) +
                                                            wavChunk("data", patternBytes(1920))));
        std::unique_ptr<QvEncodePipe> pipe(QvEncodePipe::create());
        pipe->clearStreams();
        pipe->addAudioStream(Any("rawaenc"));
        pipe->addAudioStream(Any("rawaenc"));
        AnyDict encoder, state;
        pipe->store(encoder);
        const auto stream = [&](int number) {
            const AnyDict source("file", wav.c_str(), "stream", Any(Pair(2, number)));
            return Any(AnyDict("type", 2, "sources", AnyVector(Any(source))));
        };
        const Any file(AnyDict("filename", wav.c_str()));
        state = AnyDict("__version__", "2.0", "encoder", encoder, "files", AnyVector(file, file), "streams",
                        AnyVector(stream(0), stream(0)), "rate", Any(QvFramerate(25.0)), "gain", 0.5);
        name = folder.file("job.xml");
        XmlParser::storeDict(name.c_str(), state, "TranscodeTask", "2.0");
        text = TempFolder::read(name);
    }

    QvTaskFault check(const std::string& document) const {
        folder.write("job.xml", document);
        return QvTaskFile::check(name.c_str());
    }
    // The first `from` after `after` becomes `to`.
    std::string with(const std::string& after, const std::string& from, const std::string& to) const {
        std::string changed = text;
        const std::size_t start = changed.find(after), at = changed.find(from, start);
        EXPECT_NE(start, std::string::npos) << after;
        EXPECT_NE(at, std::string::npos) << from;
        return changed.replace(at, from.size(), to);
    }

    EngineScope engine;
    TempFolder folder;
    std::string name, text;
};
