// Modules that can stand in for others.
#pragma once

class QvPreset;

// Lets the encoders of a user preset that are missing here give way to installed ones that can stand in for
// them. Whether any did.
bool qvSubstituteModules(QvPreset& preset);
