// Encoders that are set to what an input has, as far as they can be.
#pragma once

#include "tarsel/job/plan/planoptions.h"

// Whether the options ask for it.
bool fitsInputs(const PlanOptions& options);
// Sets an encoder of a type to the properties of a decoder's stream: all of them with --match, the formats
// alone where the tool chose the preset. What the encoder does not have is left.
void fitEncoder(QvEncoder& encoder, int type, const QvDecodePipe& decoder, int stream,
                const PlanOptions& options);
