// What the simple video effects share: each frame written gives one frame, and the parameters are rows over
// typed settings, stored as a dictionary under "state".
//
//     struct Settings { bool flip = false; };
//     class QvFlipper : public VideoEffectOf<Settings> {
//       public:
//         QvFlipper() : VideoEffectOf("flipper", rows) {}
//       protected:
//         int fill(const QvFrame& frame) override { return output_.copy(frame, settings_.flip); }
//     };
#pragma once

#include <cstring>
#include <span>

#include "builtin/video/paramset.h"
#include "core/engine/modules/params.h"
#include "core/filter/qvfilter.h"
#include "core/measure/qvgeometry.h"
#include "core/media/qvframe.h"

// Lifecycle and hand-over of an effect with one output frame.
class VideoEffect : public QvVideoFilter {
  public:
    int open() override;
    int close() override;
    // The output of an earlier write that nobody fetched is replaced. -18 before open, -12 for an empty
    // frame, otherwise what the effect returns; nothing is ready then.
    int write(QvFrame& frame) override;
    int ready() const override { return ready_ ? 1 : 0; }
    QvFrame* frame() override { return &output_; }
    int next() override;

  protected:
    // `tag`: static text that stands in brackets before the effect's lines in the log.
    explicit VideoEffect(const char* tag) : tag_(tag) {}

    // Makes `output_`, picture and metadata, from the frame, which is not empty. A status.
    virtual int fill(const QvFrame& frame) = 0;
    bool opened() const;
    // Of a stored dictionary: that it is this filter's and its "state", if there is one, a dictionary.
    // Otherwise false, with a line in the debug log.
    bool acceptsState(const AnyDict& dict) const;

    QvFrame output_;  // keeps its memory from frame to frame, until close

  private:
    const char* tag_;
    bool ready_ = false;
};

// The same with parameters: `rows` is the constexpr table of the settings. Rows marked qvParamStored make the
// "state". A restore that refuses one value changes none.
template <class Settings>
class VideoEffectOf : public VideoEffect {
  public:
    using Rows = std::span<const QvParamRow<Settings>>;

    int init() override {
        settings_ = {};
        return VideoEffect::init();
    }
    int setParam(const char* name, const Any& value) override {
        if (const auto result = _setRow<Settings>(rows_, settings_, name, value)) return *result;
        return VideoEffect::setParam(name, value);
    }
    // The rows, and "paramSet" if some of them have a description.
    void getParam(const char* name, Any& value) const override {
        if (qvGetParamRow<Settings>(rows_, settings_, name, value)) return;
        if (std::strcmp(name, "paramSet") == 0) {
            if (const AnyVector set = qvParamSet(rows_); !set.empty()) value = set;
            return;
        }
        VideoEffect::getParam(name, value);
    }
    void store(AnyDict& dict) const override {
        VideoEffect::store(dict);
        AnyDict state;
        qvStoreParamRows<Settings>(rows_, settings_, state);
        dict.set("state", state);
    }
    int restore(const AnyDict& dict) override {
        if (!acceptsState(dict)) return QvStatus::failed;
        if (dict.get("state").isDict()) {
            Settings restored = settings_;
            if (const int result = _restoreRows<Settings>(rows_, restored, dict.get("state").asDict()))
                return result;
            settings_ = std::move(restored);
        }
        return VideoEffect::restore(dict);
    }

    using VideoEffect::getParam;

  protected:
    VideoEffectOf(const char* tag, Rows rows) : VideoEffect(tag), rows_(rows) {}

    Settings settings_;

  private:
    Rows rows_;
};
