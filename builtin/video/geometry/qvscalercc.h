// The scaler and colour converter (module "scaler"): brings frames of any format and size to one format and
// size.
//
// Parameters: "outWidth", "outHeight" (pixels), "FOURCC" (text of four characters or the number; read as
// text, and as "FOURCCint" the number), "quality" (below 1: cubic, the default; from 1: windowed sinc of
// eight taps), "topBlankingLines" (lines of the output that stay black), "inITU" and "outITU" (YUV matrix: 0
// by the height, below 720 lines BT.601; 1 BT.601; 2 BT.709; an input frame's own matrix wins), "disableLog"
// (set only). "outFOURCC" lists the formats to offer to a user.
//
// Each frame written gives one frame. An output below 4 pixels in either direction is black.
#pragma once

#include "core/filter/qvfilter.h"
#include "core/media/qvframe.h"

class QvScalerCC : public QvVideoFilter {
  public:
    explicit QvScalerCC(const QvModule* module = nullptr);

    int init() override;
    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    int open() override;
    int close() override;
    void store(AnyDict& dict) const override;
    int restore(const AnyDict& dict) override;

    int write(QvFrame& frame) override;
    int ready() const override { return ready_; }
    QvFrame* frame() override { return &output_; }
    int next() override;

    using QvVideoFilter::getParam;

    struct Settings {
        int outWidth = 0, outHeight = 0;
        unsigned fourcc = 0;
        int quality = 0;
        int topBlankingLines = 0;
        int inITU = 0, outITU = 0;
        bool disableLog = false;
    };

  private:
    void logStart(const QvFrame& frame);
    int writeBlack(const QvFrame& frame);
    int convert(QvFrame& frame);
    unsigned callFlags(const QvFrame& frame) const;
    int scaleInto(const QvFrame& from, unsigned fromFourcc, QvFrame& to, unsigned toFourcc, unsigned flags);
    void repeatLastChroma(const QvFrame& frame);
    void finish(const QvFrame& frame);

    Settings settings_;
    QvFrame output_;
    QvFrame work_;  // BGR4, between ARGB and everything else
    int ready_ = 0;
    bool cleared_ = false;
    bool started_ = false;
};
