// Any file loads or fails with a status; what was loaded can be asked for.
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>

#include <unistd.h>

#include "core/engine/qviniparser.h"

namespace {

std::string scratchFile() {
    char name[] = "/tmp/iniparser-fuzz-XXXXXX";
    const int descriptor = mkstemp(name);
    if (descriptor < 0) std::abort();
    close(descriptor);
    return name;
}

void require(bool holds) {
    if (!holds) std::abort();
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const std::string scratch = scratchFile();
    std::FILE* const file = std::fopen(scratch.c_str(), "wb");
    require(file && std::fwrite(data, 1, size, file) == size && std::fclose(file) == 0);

    QvIniParser ini;
    const int status = ini.load(Any(scratch.c_str()), nullptr);
    require(status == 0 || status == -15);
    require(status == 0 || ini.errors().size() > 0);
    for (int i = 0; i < ini.nrSections(); ++i) {
        const Any name = ini.section(i);
        const char* const section = name.asString();
        AnyDict items;
        require(ini.getSectionItems(section, &items) == 0);
        for (const auto [key, value] : items) {
            require(value->isString());
            ini.getInt32Value(section, key, 0);
            ini.getInt64Value(section, key, 0);
            ini.getFloatValue(section, key, 0);
        }
    }
    return 0;
}
