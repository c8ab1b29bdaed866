// A transcoder over fakes that writes down what happens, in order.
#pragma once

#include <atomic>
#include <cstdio>
#include <functional>
#include <utility>

#include "core/transcode/run/qvtranscoder.h"
#include "core/transcode/task/qvtranscodetask.h"
#include "tests/support/checks.h"
#include "tests/support/events.h"
#include "tests/support/fake_streams.h"

class NotedAudio : public FakeAudioEncoder {
  public:
    explicit NotedAudio(Events& events) : events_(events) {}
    int writePcm(QvPcm* pcm, int samples) override {
        if (!quiet) events_.add("a" + std::to_string(samples < 0 ? pcm->samples() : samples));
        return FakeAudioEncoder::writePcm(pcm, samples);
    }
    bool quiet = false;

  private:
    Events& events_;
};

class NotedPipe : public FakeEncodePipe {
  public:
    NotedPipe(Events& events, const QvFramerate& rate) : FakeEncodePipe(rate), events_(events) {
        audio(48000);
        auto noted = std::make_unique<NotedAudio>(events);
        sound = noted.get();
        noted->params = audios[0]->params;
        audios[0] = std::move(noted);
    }
    int open() override { return note("open", openResult); }
    int close() override { return note("close", closeResult); }
    int abort() override { return note("abort", 0); }
    int writeFrame(QvFrame* frame, int stream) override {
        const int result = FakeEncodePipe::writeFrame(frame, stream);
        return quiet ? result : note("v" + std::to_string(frame->frameNr), result);
    }
    void getParam(const char* name, Any& value) const override {
        if (std::string(name) == "filename")
            value = filename;
        else
            FakeEncodePipe::getParam(name, value);
    }

    int openResult = 0, closeResult = 0;
    bool quiet = false;
    NotedAudio* sound = nullptr;
    Any filename;

  private:
    int note(const std::string& what, int result) {
        events_.add(what);
        return result ? setError(result, "%s failed", what.c_str()) : 0;
    }
    Events& events_;
};

class NotedTranscoder : public QvTranscoder {
  public:
    explicit NotedTranscoder(Events& events, QvTask* task = nullptr) : QvTranscoder(task), events_(events) {
        setParam("startDelay", 0);
    }
    ~NotedTranscoder() override { stop(); }

    void cbDone(int result) override {
        events_.add("done" + std::to_string(result));
        if (onDone) onDone();
    }
    int cbProgress(double part) override {
        char text[16];
        std::snprintf(text, sizeof text, "%.2f", part);
        return events_.add(text), 0;
    }
    void cbPaused(bool paused) override { events_.add(paused ? "paused" : "resumed"); }
    int cbProcess() override {
        ++rounds;
        return onProcess ? onProcess() : 0;
    }
    void cbPostprocess(const Any& command) override {
        events_.add(std::string("post:") + command.asString());
    }
    int cbMuxClose(QvMuxer*) override { return events_.add("muxclose"), 0; }

    std::function<int()> onProcess;
    std::function<void()> onDone;
    std::atomic<int> rounds{0};

  private:
    Events& events_;
};

// `frames` of 25 a second with 48 kHz sound. Sources, output and task outlive the transcoder.
struct Job {
    explicit Job(int frames = 2, bool linked = false)
        : decoder(frames, QvFramerate::f25p()), pipe(events, QvFramerate::f25p()) {
        decoder.audio(frames * 1920LL, 48000);
        task.setEncoder(&pipe);
        if (linked) linkBoth();
    }
    void linkBoth() {
        ASSERT_EQ(task.link(&decoder, qvVideoStream, 0, 0), 0);
        ASSERT_EQ(task.link(&decoder, qvAudioStream, 0, 0), 1);
    }

    Events events;
    FakeDecoder decoder;
    NotedPipe pipe;
    QvTask task;
};

// A job with both links and its transcoder.
struct LinkedJob : Job {
    explicit LinkedJob(int frames = 2) : Job(frames, true) {}
    void beQuiet() {  // no steps in the events
        pipe.quiet = pipe.sound->quiet = true;
        t.setParam("progress", AnyDict("off", 1));
    }
    NotedTranscoder t{events, &task};
};
