#include <fontconfig/fontconfig.h>
#include <memory>

#include "core/arch/platform.h"

namespace {

template <auto destroy>
struct With {
    void operator()(auto* object) const { destroy(object); }
};
using Config = std::unique_ptr<FcConfig, With<FcConfigDestroy>>;
using Pattern = std::unique_ptr<FcPattern, With<FcPatternDestroy>>;

struct Face {
    const char*
        family;  // fontconfig answers with the metric equivalent where the face itself is not installed
    int weight;
    int slant;
};

// In the order of QvFontFace.
constexpr Face faces[] = {
    {"Arial", FC_WEIGHT_NORMAL, FC_SLANT_ROMAN},
    {"Arial", FC_WEIGHT_NORMAL, FC_SLANT_ITALIC},
    {"Arial", FC_WEIGHT_BOLD, FC_SLANT_ROMAN},
    {"Courier New", FC_WEIGHT_BOLD, FC_SLANT_ROMAN},
};

Pattern request(const Face& face) {
    Pattern pattern(FcPatternCreate());
    FcPatternAddString(pattern.get(), FC_FAMILY, reinterpret_cast<const FcChar8*>(face.family));
    FcPatternAddInteger(pattern.get(), FC_WEIGHT, face.weight);
    FcPatternAddInteger(pattern.get(), FC_SLANT, face.slant);
    FcPatternAddBool(pattern.get(), FC_SCALABLE, FcTrue);
    return pattern;
}

}  // namespace

std::string QvPlatform::fontFile(QvFontFace face) {
    // A configuration of our own: an application may be using the shared one on another thread.
    const Config config(FcInitLoadConfigAndFonts());
    if (!config) return "";
    const Pattern wanted = request(faces[static_cast<int>(face)]);
    FcConfigSubstitute(config.get(), wanted.get(), FcMatchPattern);
    FcDefaultSubstitute(wanted.get());
    FcResult result = FcResultNoMatch;
    const Pattern found(FcFontMatch(config.get(), wanted.get(), &result));
    FcChar8* file = nullptr;
    if (!found || FcPatternGetString(found.get(), FC_FILE, 0, &file) != FcResultMatch) return "";
    return reinterpret_cast<const char*>(file);
}
