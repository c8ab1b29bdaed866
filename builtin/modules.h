// The module classes of the library by name, for code that makes one without the registry.
#pragma once

#include <algorithm>
#include <cstddef>

#include "builtin/builtinmodule.h"

template <std::size_t Size>
struct QvBuiltinName {
    char text[Size];
    consteval QvBuiltinName(const char (&name)[Size]) { std::copy_n(name, Size, text); }
};

template <QvBuiltinName Name>
class QvBuiltinModuleOf final : public QvBuiltinModule {
  public:
    QvBuiltinModuleOf() : QvBuiltinModule(qvBuiltinRow(Name.text)) {}
};

// clang-format off
using AudioMixDecModule        = QvBuiltinModuleOf<"aumixdec">;
using BobberModule             = QvBuiltinModuleOf<"bobber">;
using ChConvertModule          = QvBuiltinModuleOf<"chconvert">;
using DeinterlaceModule        = QvBuiltinModuleOf<"deinterlace">;
using DummyAudioEncoderModule  = QvBuiltinModuleOf<"dummyaenc">;
using DynamicsModule           = QvBuiltinModuleOf<"dynamics">;
using EncodePipe2Module        = QvBuiltinModuleOf<"encpipe">;
using FileSinkModule           = QvBuiltinModuleOf<"filesink">;
using FlipperModule            = QvBuiltinModuleOf<"flipper">;
using LogoModule               = QvBuiltinModuleOf<"logo">;
using MVMetaDecModule          = QvBuiltinModuleOf<"mvmetadec">;
using MVProcessModule          = QvBuiltinModuleOf<"mvprocess">;
using QvADelayModule           = QvBuiltinModuleOf<"adelay">;
using QvAVolModule             = QvBuiltinModuleOf<"avol">;
using QvAfModule               = QvBuiltinModuleOf<"aprocess">;
using QvAnimatedLogoModule     = QvBuiltinModuleOf<"animatedlogo">;
using QvAquantModule           = QvBuiltinModuleOf<"aquant">;
using QvBrightnessModule       = QvBuiltinModuleOf<"brightness">;
using QvCropModule             = QvBuiltinModuleOf<"cropper">;
using QvFramerateModule        = QvBuiltinModuleOf<"frconvert">;
using QvRawdumpModule          = QvBuiltinModuleOf<"rawdump">;
using QvSamplerateModule       = QvBuiltinModuleOf<"srconvert">;
using QvScalerCCModule         = QvBuiltinModuleOf<"scaler">;
using QvSubtitleModule         = QvBuiltinModuleOf<"subtitle">;
using QvTimecodeModule         = QvBuiltinModuleOf<"timecode">;
using QvUserDataModule         = QvBuiltinModuleOf<"userdata">;
using QvVfModule               = QvBuiltinModuleOf<"vprocess">;
using MemInputModule           = QvBuiltinModuleOf<"meminput">;
using MemMuxModule             = QvBuiltinModuleOf<"memmux">;
using MemSinkModule            = QvBuiltinModuleOf<"memsink">;
using NormalizerModule         = QvBuiltinModuleOf<"normalizer">;
using NullMuxModule            = QvBuiltinModuleOf<"nullmux">;
using NullSinkModule           = QvBuiltinModuleOf<"nullsink">;
using P2DecoderModule          = QvBuiltinModuleOf<"p2dec">;
using RawAudioEncoderModule    = QvBuiltinModuleOf<"rawaenc">;
using RawAviMuxerModule        = QvBuiltinModuleOf<"rawavimux">;
using RawDecoderModule         = QvBuiltinModuleOf<"rawdec">;
using RawMuxerModule           = QvBuiltinModuleOf<"rawmux">;
using RawVideoEncoderModule    = QvBuiltinModuleOf<"rawvenc">;
using SccDecModule             = QvBuiltinModuleOf<"sccdec">;
using SubImporterModule        = QvBuiltinModuleOf<"subimport">;
using TMAudioPanningModule     = QvBuiltinModuleOf<"panning">;
using TMAudioVolumeModule      = QvBuiltinModuleOf<"audiolevel">;
using TMVideoFadeModule        = QvBuiltinModuleOf<"videofade">;
using TestGeneratorModule      = QvBuiltinModuleOf<"testgen">;
using WavDecModule             = QvBuiltinModuleOf<"wavdec">;
// clang-format on
