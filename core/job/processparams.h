// What is to happen to one stream on its way from a decoder to an encoder. All are typed views over plain
// dictionaries and vectors, which is also how they are stored.
#pragma once

#include <optional>

#include "core/arch/api.h"
#include "core/job/filtersstate.h"
#include "core/job/jobdescription.h"
#include "core/job/qualitystats.h"
#include "core/measure/qvgeometry.h"
#include "core/value/anycontainer.h"

// A flat list of times: in point, out point, in point, ... Times are at 35280000 ticks a second. An index
// beyond the pairs asserts "index out of range".
class QV_API InOutPoints : public AnyVector {
  public:
    InOutPoints() = default;
    InOutPoints(const MediaTime& in, const MediaTime& out);
    InOutPoints(const AnyVector& points) : AnyVector(points) {}

    int count() const;  // pairs

    // An index equal to count appends a pair whose other half is 0.
    void setInPoint(int index, const MediaTime& time);
    void setInPoint(const MediaTime& time) { setInPoint(0, time); }
    void setOutPoint(int index, const MediaTime& time);
    void setOutPoint(const MediaTime& time) { setOutPoint(0, time); }

    MediaTime inPoint(int index = 0) const;
    MediaTime outPoint(int index = 0) const;
    MediaTime duration(int index = 0) const;  // out minus in

    // The out point becomes in plus the time; without such a pair (0, time) is appended. The out point is
    // computed from pair `index` and always written to pair 0.
    void setDuration(int index, const MediaTime& time);
    void setDuration(const MediaTime& time) { setDuration(0, time); }

    // In moves by delta; out ends at the old in point plus twice delta.
    void move(int index, const MediaTime& delta);
    void move(const MediaTime& delta) { move(0, delta); }
};

// Accessors give nothing (0 for smartRender) when the key is absent or of another type.
class QV_API ProcessParams : public AnyDict {
  public:
    ProcessParams() = default;
    ProcessParams(const AnyDict& dict) : AnyDict(dict) {}

    void setInOutPoints(const InOutPoints& points);
    std::optional<InOutPoints> inOutPoints() const;
    void setFilters(const FiltersState& filters);
    std::optional<FiltersState> filters() const;
    // Frame numbers of the input, Int32 or Int64, never mixed.
    void setChapterPoints(const AnyVector& points);
    const AnyVector* chapterPoints() const;
    // The connection matrix of an audio link.
    void setAudioChannelMap(const AnyVector& map);
    const AnyVector* audioChannelMap() const;
    // How the sound is converted: key "audioConversion".
    void setAudioConversion(const AudioConversion& conversion);
    std::optional<AudioConversion> audioConversion() const;
    // Pictures: whether the last one is repeated up to an out point beyond the end of the input. Key
    // "holdLast", Int32.
    void setHoldLast(bool on);
    bool holdLast() const;
    // 0 off, 1 on, 2 passed on unchanged; others are logged and stored as 0.
    void setSmartRender(int mode);
    int smartRender() const;
    void setQualityLog(const QvEncodingQualityStatsSetup& setup);
    std::optional<QvEncodingQualityStatsSetup> getQualityStatsSetup() const;
};

// Caption handling of one meta source.
class QV_API MetaProcessParams : public AnyDict {
  public:
    MetaProcessParams() = default;
    MetaProcessParams(const AnyDict& dict) : AnyDict(dict) {}

    void setCcMode(bool do608, bool do708, int fmt, bool valid608_1Fillers, bool valid608_2Fillers);
    bool doCc608() const;
    bool doCc708() const;
    int ccUserDataFmt() const;  // -1 when not set
    bool valid608_1Fillers() const;
    bool valid608_2Fillers() const;
};
