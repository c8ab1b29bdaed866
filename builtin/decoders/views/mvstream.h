// The picture of the decoder "mvmetadec": reads the same frame of all inputs and shows them by a layout.
#pragma once

#include <string>
#include <vector>

#include "builtin/decoders/views/viewinput.h"
#include "core/decode/basedecodepipe.h"
#include "core/value/ptrlist.h"

class MVStream : public DPipeVideoStream {
  public:
    // Opens the inputs. Why the views can't be shown so; empty if they can.
    std::string prepare(const QvViewSetup& setup, const Any* inputParams);

    // 0, -4 after the last frame, or another status with failure(). After a failure the inputs may be at
    // different frames: reads fail until a seek succeeds.
    int read();
    int seek(long long frame);
    QvFrame* current() const { return current_; }  // null before the first read
    const std::string& failure() const { return failure_; }

    const std::vector<ViewInput>& inputs() const { return inputs_; }

  private:
    QvViewLayout layout_ = QvViewLayout::interleaved;
    std::vector<ViewInput> inputs_;
    std::size_t first_ = 0;  // inputs that are read
    std::size_t last_ = 0;
    int views_ = 0;
    std::vector<QvFrame*> shown_;  // of the current frame
    TPtrList<QvFrame> links_;
    QvFrame* current_ = nullptr;
    long long next_ = 0;
    long long frames_ = 0;
    bool lost_ = false;
    std::string failure_;

    bool chained() const;
    std::string checkJoin() const;
    std::string publish();
    int show();
    int link();
    int join();
    int fail(int code, const std::string& text);
};
