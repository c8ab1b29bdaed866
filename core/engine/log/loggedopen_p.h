// Opening a file by its name as a value.
#pragma once

#include <cstdio>
#include <memory>

class Any;
class QvCancel;

// A stream of the C library, or null after a line in the debug log. Asserts that `name` is text. The caller
// closes it with fclose. The mode is fopen's; with a wide name at most its first four characters count.
std::FILE* qvOpenLogged(const Any& name, const char* mode);
// The same for QvPlatform::openOutput.
std::FILE* qvOpenOutputLogged(const Any& name, const std::shared_ptr<QvCancel>& cancel, bool& isStream);
