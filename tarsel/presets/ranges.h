// What a preset or an encoder can do, as against what a job asks of it.
#pragma once

#include <string>

#include <qvplugcore/qvplugcore.h>

// Throw Failure (usage) for a format outside the range that the preset or else the encoder names; the
// encoders of raw streams take anything. `preset` may be null.
void checkPictureRanges(const QvPreset* preset, const QvCodec& encoder, int width, int height,
                        const QvFramerate& rate);
void checkSoundRanges(const QvPreset* preset, const QvCodec& encoder, int samplerate, int channels, int bits);
