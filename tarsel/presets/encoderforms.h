// In which form an encoder takes its pictures, where it has several.
#pragma once

#include <qvplugcore/qvplugcore.h>

// Sets "type" of an encoder that names "allowedTypes": the form `fourcc`, or the one next to it that loses
// nothing. Without `asked`, for the form of the input, only encoders do so that answer "keepsForm": those of
// masters and archives. Throws Failure (usage) if the form was asked for and there is none.
void takeForm(QvCodec& encoder, unsigned fourcc, bool asked);
