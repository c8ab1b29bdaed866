// Who may change a file that is to be loaded as code.
#pragma once

#include <string>

#include "core/arch/platform.h"

struct QvFoundFile {
    std::string name;  // full, without links; "" if it was not found or is refused
    QvLibraryFault fault = QvLibraryFault::none;
    std::string reason;  // the end of a sentence that begins with the file
};

// Follows a name to the regular file that it leads to. With QvLibraryTrust::owner nothing on the way may be
// in the hands of others, see there.
QvFoundFile qvFindLibrary(const std::string& name, QvLibraryTrust trust);
