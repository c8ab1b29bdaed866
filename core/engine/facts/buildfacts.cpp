// What this library is and where it runs.
#include <string>

#include "core/arch/platform.h"
#include "core/engine/qvutil.h"

Any QvUtil::libraryPath() { return Any(qv_platform().coreLibraryPath().c_str()); }

Any QvUtil::libraryVersion() { return Any("2.5.10.7839"); }

Any QvUtil::buildDate() { return Any("2011-10-12"); }

Any QvUtil::buildPlatform() { return Any(qv_platform().platformName().c_str()); }

Any QvUtil::cpuDescription() {
    const std::string text = "Processors: " + std::to_string(qv_platform().processors()) +
                             " Features: " + qv_platform().cpuFeatures();
    return Any(text.c_str());
}
