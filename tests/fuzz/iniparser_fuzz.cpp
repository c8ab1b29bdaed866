// Any file loads or fails with a status; what was loaded can be asked for.
#include "core/document/qviniparser.h"
#include "tests/fuzz/fuzz.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const MemoryFile file(data, size);
    QvIniParser ini;
    const int status = ini.load(Any(file.name()), nullptr);
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
