// Any bytes as a file of presets: what check() accepts loads without an assertion, in each mode; what was
// loaded stores and loads again as it was; and what fails leaves the list unchanged.
#include "core/arch/qvexception.h"
#include "core/engine/modules/init.h"
#include "core/preset/qvuserpresets.h"
#include "tests/fuzz/fuzz.h"

namespace {

enum class End { loaded, refused, asserted };

End load(QvUserPresets& presets, const MemoryFile& file, int mode) {
    const QvUserPresets before = presets;
    int version = 0;
    try {
        presets.load(file.name(), mode, &version);
    } catch (const QvAssertFailure&) {
        require(presets == before);
        return End::asserted;
    }
    require(version != 0 || presets == before);
    return version != 0 ? End::loaded : End::refused;
}

// Numbers with a point have six places in a file, so the first round may change them, and further ones not.
void checkRounds(QvUserPresets presets) {
    const MemoryFile first, second;
    QvUserPresets once, twice;
    require(presets.save(first.name()) == 0 && load(once, first, 0) == End::loaded);
    require(once.count() == presets.count());
    require(once.save(second.name()) == 0 && load(twice, second, 0) == End::loaded);
    require(once == twice);
}

}  // namespace

extern "C" int LLVMFuzzerInitialize(int*, char***) { return init_wrapper(nullptr); }

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const MemoryFile file(data, size);
    const bool sound = QvUserPresets::check(file.name()).empty();
    QvUserPresets presets;
    const End end = load(presets, file, QvUserPresets::clearFirst);
    require(sound == (end == End::loaded));
    if (!sound) return 0;
    const int count = presets.count();
    require(load(presets, file, QvUserPresets::keep) == End::loaded && presets.count() == 2 * count);
    // A preset that is replaced must have a name that presets of users may have.
    load(presets, file, QvUserPresets::overwrite);
    checkRounds(presets);
    const int valid = presets.checkPresets(QvUserPresets::describeInvalid | QvUserPresets::substituteModules);
    require(presets.checkPresets(QvUserPresets::removeInvalid) == valid && presets.count() == valid);
    return 0;
}
