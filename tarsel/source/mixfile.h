// Metafiles with a mix of sounds as inputs, and what is made of them.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include <qvplugcore/qvplugcore.h>

bool isMixName(const std::string& name);  // "x.mmf"

// The set-up of a metafile as QvAudioMixDecSetup::store makes it, names from its folder on. A list of mono
// files becomes one: each file's first channel is a channel. Throws Failure (input).
AnyDict readMix(const std::string& name);

// An open decoder of a metafile, null if it is one of something else; or of a set-up, which messages call
// `name`, or "--ch" where that is empty. Throws Failure (input), also for an input of the mix that can't be
// opened.
std::unique_ptr<QvDecodePipe> openMix(const std::string& name);
std::unique_ptr<QvDecodePipe> openMix(const std::string& name, const AnyDict& setup);

// Throws Failure (input) if the decoder is a mix an input of which can't be opened.
void requireMixed(const std::string& name, const QvDecodePipe& decoder);
// The files of which a decoder makes its mix, with those of mixes in it; none for any other decoder.
std::vector<std::string> mixedFiles(const QvDecodePipe& decoder);
// Why one of them holds less than its header says; empty when all are whole.
std::string mixDamage(const QvDecodePipe& decoder);
