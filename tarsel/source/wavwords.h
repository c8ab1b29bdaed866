// Texts of a WAV ("LIST" with "INFO") as those of a film, and the other way.
#pragma once

#include <string>

#include <qvplugcore/qvplugcore.h>

// By the keys of films: "title", "artist", ... Empty for none.
AnyDict wavWords(const AnyVector& chunks);
// Whether a WAV has a place for it.
bool isWavWord(const std::string& key);
// Whether a chunk has such texts, and nothing that films have no key for.
bool isOfWavWords(const Any& chunk);
// The chunks with these words in the place of their own; the same ones if they say them already. Keys that a
// WAV has no place for are left out.
AnyVector withWavWords(const AnyVector& chunks, const AnyDict& words);
