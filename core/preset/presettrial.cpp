#include "core/preset/presettrial_p.h"

#include "core/arch/qvexception.h"
#include "core/encode/qvencodepipe.h"
#include "core/preset/qvpresetmgr.h"
#include "core/preset/qvprofile.h"
#include "core/value/any.h"

namespace {

// The message of an assertion without the place where it was made.
std::string messageOf(const QvException& failure) {
    const std::string text = failure.what();
    const auto end = text.find(": \n");
    return end == std::string::npos ? text : text.substr(end + 3);
}

// Plug-ins' profiles have no symbol.
Any symbolOf(int profile) {
    const char* symbol = qvProfileToSym(qvFixOldProfileNo(profile));
    return *symbol ? Any(symbol) : Any::sprintf("0x%X", static_cast<unsigned>(profile));
}

}  // namespace

// A preset may come from anywhere, so a state that breaks the pipe's contract only makes the preset invalid.
PresetTrial::PresetTrial(const QvPreset& preset) : pipe(QvEncodePipe::create()) {
    if (!pipe) {
        failure = "There is no encode pipe";
        return;
    }
    try {
        if (pipe->applyPreset(preset, 0) == 0) return;
        failure = pipe->errorDesc();
    } catch (const QvMemoryFailure&) {
        throw;
    } catch (const QvException& broken) {
        failure = messageOf(broken);
    }
    pipe.reset();
}

PresetTrial::~PresetTrial() = default;

std::string qvWhyInvalid(const QvPreset& preset) {
    if (preset.profile() == QvProfile::notSet) return "Uninitialized preset object?";
    if (!qvPresetMgr()->profileAvailable(preset.profile()))
        return Any::sprintf("Base profile '%s' not available - missing plugins?",
                            symbolOf(preset.profile()).asString())
            .asString();
    const PresetTrial trial(preset);
    if (trial.pipe) return "";
    return std::string(preset.name()) + " - " + trial.failure;
}
