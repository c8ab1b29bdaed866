// What is known by name and not registered, because the libraries have nothing that does its work.
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvplugin.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"
#include "plugins/av/door/avmodules.h"

namespace av {
namespace {

struct Missing {
    const char* name;
    int type;
    const char* reason;
};

constexpr int video = QvModuleType::videoEncoder;
constexpr int audio = QvModuleType::audioEncoder;
constexpr int muxer = QvModuleType::muxer;

// clang-format off
constexpr Missing missing[] = {
    {"vc1venc",        video, "libavcodec reads VC-1, and has no encoder of it"},
    {"avsvenc",        video, "libavcodec is packaged without an encoder of AVS"},
    {"svcvenc",        video, "libavcodec has no encoder of scalable H.264; h264venc writes one layer"},
    {"mvcvenc",        video, "libavcodec has no encoder of several views; h264venc writes one"},
    {"bch264venc",     video, "it is another encoder of H.264; h264venc does its work"},
    {"h264mfxvenc",    video, "it needs a graphics processor; h264venc does its work"},
    {"h264cudavenc",   video, "it needs a graphics processor; h264venc does its work"},
    {"h264openclvenc", video, "it needs a graphics processor; h264venc does its work"},
    {"divxvenc",       video, "libavcodec has no encoder that keeps to the rules of these profiles; mpeg4venc writes MPEG-4"},
    {"divxh264venc",   video, "libavcodec has no encoder that keeps to the rules of these profiles; h264venc writes H.264"},
    {"amraenc",        audio, "libavcodec is packaged without an encoder of AMR, which it reads"},
    {"wmaaenc",        audio, "it goes with VC-1 in ASF, which can't be written"},
    {"asfmux",         muxer, "it goes with VC-1, which libavcodec can't encode"},
    {"dmfmux",         muxer, "libavformat does not write this kind of AVI; dvavimux writes AVI"},
    {"dv100mux",       muxer, "dvmux writes streams of DVCPRO HD as well"},
    {"mj2mux",         muxer, "libavformat does not write Motion JPEG 2000; movmux and mxfmux hold JPEG 2000"},
    {"mpegtsmux",      muxer, "mptsmux writes transport streams"},
    {"mvrawmux",       muxer, "libavcodec has no encoder of several views"},
};
// clang-format on

}  // namespace

void addMissing(QvPlugin& plugin) {
    AnyVector all;
    for (const Missing& row : missing)
        all.append(AnyDict("name", row.name, "type", row.type, "reason", row.reason));
    plugin.setAttr("missing", all);
}

}  // namespace av
