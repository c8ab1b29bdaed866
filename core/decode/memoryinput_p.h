// How the factory reaches the memory input, a module that the registry does not list.
#pragma once

#include <memory>

class QvByteSource;
class QvDecodePipe;

// In state 2, with a source that it owns; null for none. Defined in builtin/decoders/meminput.cpp.
std::unique_ptr<QvDecodePipe> qvNewMemoryInput(std::unique_ptr<QvByteSource> source);

// All decoders that list an extension, best first; if the registry chooses none of them by it alone, those
// that are never chosen so.
class Any;
class AnyVector;
AnyVector qvDecodersOf(const Any& extension);
