#include "core/transcode/run/transcodersettings_p.h"

#include "core/engine/log/qvlog.h"
#include "core/engine/modules/params.h"
#include "core/measure/qvgeometry.h"

namespace {

using Settings = TranscoderSettings;
using Row = QvParamRow<Settings>;

void take(AnyDict& to, const Any& from) { to = from.isDict() ? from.asDict() : AnyDict(); }
void take(AnyVector& to, const Any& from) { to = from.isVector() ? from.asVector() : AnyVector(); }

// A container; any other value empties it.
template <auto member>
int replace(Settings& settings, const Any& value) {
    take(settings.*member, value);
    return QvStatus::ok;
}

template <auto member>
void answer(const Settings& settings, Any& value) {
    value = settings.*member;
}

struct Text {
    char text[32];
};

// A container of the whole transcoder, which the parameters of one stream have as well.
template <auto member, Text what>
int replaceGlobal(Settings& settings, const Any& value) {
    qv_dbg()->warning("Transcoder: Setting global %s, using ProcessParams is recommended.", what.text);
    return replace<member>(settings, value);
}

using Access = QvParamAccess<Settings>;

constexpr Row rows[] = {
    {"twoPass", &Settings::twoPass},
    {"metaName", &Settings::metaName, qvParamWriteOnly},
    {"writeLogfile", &Settings::writeLogfile},
    {"closeEncoder", &Settings::closeEncoder, qvParamWriteOnly},
    {"smartRender", &Settings::smartRender, qvParamWriteOnly},
    {"timecodeOffset", &Settings::timecodeOffset, qvParamWriteOnly},
    {"getOut", &Settings::getOut, qvParamWriteOnly},
    {"startDelay", &Settings::startDelay, qvParamPlain, 0, 10000},
    {"progress", Access{replace<&Settings::progress>, answer<&Settings::progress>}},
    {"effects", Access{replaceGlobal<&Settings::effects, Text{"video 'effects'"}>}},
    {"audioEffects", Access{replaceGlobal<&Settings::audioEffects, Text{"'audioEffects'"}>}},
    {"chapters", Access{replaceGlobal<&Settings::chapters, Text{"'chapterPoints'"}>}},
    {"connMatrix", Access{replaceGlobal<&Settings::connMatrix, Text{"'connMatrix' parameter"}>,
                          answer<&Settings::connMatrix>}},
};
static_assert(qvParamTableOk<Settings>(rows));

}  // namespace

std::optional<int> TranscoderSettings::setParam(const char* name, const Any& value) {
    return qvSetParamRow<Settings>(rows, *this, name, value);
}

void TranscoderSettings::getParam(const char* name, Any& value) const {
    qvGetParamRow<Settings>(rows, *this, name, value);
}
