#include "core/transcode/task/qvencodepipestate.h"

#include "core/arch/qvassert.h"
#include "core/measure/streamtype.h"
#include "core/preset/qvpresetmgr.h"

int QvEncodePipeStreamState::type() const { return getInt32("type", 0); }

AnyDict QvEncodePipeStreamState::codecParams() const { return getDict("codec"); }

Any QvEncodePipeStreamState::codecName() const { return getDict("codec").get("name"); }

AnyDict QvEncodePipeStreamState::streamParams() const { return getDict("stream"); }

AnyDict QvEncodePipeStreamState::codecInfo() const { return getDict("codecInfo"); }

Any QvEncodePipeStreamState::codecDisplayName() const {
    const Any& name = getDict("codecInfo").get("displayName");
    return name.isValid() ? name : codecName();
}

Any QvEncodePipeStreamState::framerate() const { return getDict("codecInfo").get("framerate"); }

Any QvEncodePipeStreamState::bitrate() const { return getDict("codecInfo").get("bitrate"); }

int QvEncodePipeStreamState::samplerate() const { return getDict("codecInfo").getInt32("samplerate", 0); }

int QvEncodePipeStreamState::width() const { return getDict("codecInfo").getInt32("width", 0); }

int QvEncodePipeStreamState::height() const { return getDict("codecInfo").getInt32("height", 0); }

int QvEncodePipeStreamState::channels() const { return getDict("codecInfo").getInt32("channels", 0); }

AnyVector QvEncodePipeState::streams() const { return getVector("streams"); }

QvEncodePipeStreamState QvEncodePipeState::stream(int index) const {
    const AnyVector& all = getVector("streams");
    QV_ASSERT_MSG(index >= 0 && index < all.size(), "Invalid list index");
    return all.at(index).isDict() ? all.at(index).asDict() : AnyDict();
}

QvEncodePipeStreamState QvEncodePipeState::stream(const Pair& address) const {
    int left = address.second;
    for (const Any& entry : getVector("streams"))
        if (entry.isDict() && entry.asDict().getInt32("type", 0) == address.first && left-- == 0)
            return entry.asDict();
    return {};
}

int QvEncodePipeState::nrStreams(int type) const {
    const AnyVector& all = getVector("streams");
    if (type == 0 || type == qvAllStreams) return all.size();
    int count = 0;
    for (const Any& entry : all)
        if (entry.isDict() && (entry.asDict().getInt32("type", 0) & type) != 0) ++count;
    return count;
}

AnyDict QvEncodePipeState::muxer() const { return getDict("muxer"); }

Any QvEncodePipeState::muxerName() const { return getDict("muxer").get("name"); }

Any QvEncodePipeState::muxerDisplayName() const {
    const Any& name = getDict("muxer").get("displayName");
    return name.isValid() ? name : muxerName();
}

AnyVector QvEncodePipeState::programs() const { return getVector("programs"); }

Any QvEncodePipeState::presetName() const {
    if (get("presetName").isString()) return get("presetName");
    if (!get("profile").isInt32()) return Any();
    const int index = qvPresetMgr()->findByProfile(get("profile").asInt32());
    return index >= 0 ? Any(qvPresetMgr()->builtinPreset(index).name()) : Any();
}
