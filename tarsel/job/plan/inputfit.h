// Sets encoders to the properties of an input (--match), as far as they support them.
#pragma once

#include "tarsel/job/plan/planoptions.h"

// Whether the options ask for it.
bool fitsInputs(const PlanOptions& options);
// Sets an encoder of a type to the properties of a decoder's stream: all of them with --match, the formats
// alone where the tool chose the preset. Properties that the encoder lacks are skipped.
void fitEncoder(QvEncoder& encoder, int type, const QvDecodePipe& decoder, int stream,
                const PlanOptions& options);
