#include <fontconfig/fontconfig.h>
#include <algorithm>
#include <array>
#include <cstdlib>
#include <memory>
#include <mutex>
#include <new>

#include "core/arch/platform.h"

namespace {

template <auto destroy>
struct With {
    void operator()(auto* object) const { destroy(object); }
};
using Config = std::unique_ptr<FcConfig, With<FcConfigDestroy>>;
using Pattern = std::unique_ptr<FcPattern, With<FcPatternDestroy>>;
using FontSet = std::unique_ptr<FcFontSet, With<FcFontSetDestroy>>;
using CharSet = std::unique_ptr<FcCharSet, With<FcCharSetDestroy>>;
using Objects = std::unique_ptr<FcObjectSet, With<FcObjectSetDestroy>>;

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

constexpr const char* genericFamilies[] = {"sans", "sans-serif", "serif", "mono", "monospace"};

constexpr std::size_t spareBytes = 8 << 20;

using Files = std::array<std::string, std::size(faces)>;

// fontconfig ends the process where an allocation fails. With some dozens of fonts it takes 4 MB, so it is
// not called with less than twice that.
void needSpareMemory() {
    void* volatile spare = std::malloc(spareBytes);  // volatile, or the compiler leaves both calls out
    if (!spare) throw std::bad_alloc();
    std::free(spare);
}

Pattern request(const Face& face, const char* family) {
    Pattern pattern(FcPatternCreate());
    if (!pattern) throw std::bad_alloc();
    FcPatternAddString(pattern.get(), FC_FAMILY, reinterpret_cast<const FcChar8*>(family));
    FcPatternAddInteger(pattern.get(), FC_WEIGHT, face.weight);
    FcPatternAddInteger(pattern.get(), FC_SLANT, face.slant);
    FcPatternAddBool(pattern.get(), FC_SCALABLE, FcTrue);
    return pattern;
}

// With what the configuration adds to a request.
void complete(FcConfig* config, FcPattern* wanted) {
    FcConfigSubstitute(config, wanted, FcMatchPattern);
    FcDefaultSubstitute(wanted);
}

QvFontFile fileOf(FcPattern* font) {
    FcChar8* file = nullptr;
    int face = 0;
    if (FcPatternGetString(font, FC_FILE, 0, &file) != FcResultMatch) return {};
    FcPatternGetInteger(font, FC_INDEX, 0, &face);
    return {reinterpret_cast<const char*>(file), face};
}

// Letters that are pictures in colour can't be drawn.
bool hasOutlines(FcPattern* font) {
    FcBool scalable = FcFalse, colour = FcFalse;
    FcPatternGetBool(font, FC_SCALABLE, 0, &scalable);
    FcPatternGetBool(font, FC_COLOR, 0, &colour);
    return scalable && !colour;
}

// Whether a font is of the family that was asked for, or of one that the configuration says is the same; it
// appends others, weakly bound, so that there is always an answer.
bool isAnswer(FcPattern* font, FcPattern* wanted) {
    FcChar8* family = nullptr;
    FcValue value;
    FcValueBinding binding = FcValueBindingWeak;
    for (int own = 0; FcPatternGetString(font, FC_FAMILY, own, &family) == FcResultMatch; ++own)
        for (int i = 0; FcPatternGetWithBinding(wanted, FC_FAMILY, i, &value, &binding) == FcResultMatch; ++i)
            if (binding != FcValueBindingWeak && FcStrCmpIgnoreCase(value.u.s, family) == 0) return true;
    return false;
}

bool isGeneric(const std::string& family) {
    const auto* const name = reinterpret_cast<const FcChar8*>(family.c_str());
    return std::any_of(std::begin(genericFamilies), std::end(genericFamilies), [name](const char* generic) {
        return FcStrCmpIgnoreCase(name, reinterpret_cast<const FcChar8*>(generic)) == 0;
    });
}

std::string match(FcConfig* config, const Face& face) {
    const Pattern wanted = request(face, face.family);
    complete(config, wanted.get());
    FcResult result = FcResultNoMatch;
    const Pattern found(FcFontMatch(config, wanted.get(), &result));
    return found ? fileOf(found.get()).name : "";
}

Files askForAll() {
    needSpareMemory();
    Files files;
    // A configuration of our own: an application may be using the shared one on another thread.
    const Config config(FcInitLoadConfigAndFonts());
    if (!config) return files;
    for (std::size_t i = 0; i < files.size(); ++i) files[i] = match(config.get(), faces[i]);
    return files;
}

}  // namespace

std::string QvPlatform::fontFile(QvFontFace face) {
    static std::mutex mutex;
    static Files known;
    const std::lock_guard lock(mutex);
    std::string& file = known[static_cast<std::size_t>(face)];
    QvFileStatus status;
    if (file.empty() || !this->status(file.c_str(), status)) known = askForAll();
    return file;
}

std::vector<QvFontFile> QvPlatform::fontsWith(std::u32string_view letters, QvFontFace like) {
    needSpareMemory();
    std::vector<QvFontFile> files;
    const Config config(FcInitLoadConfigAndFonts());
    const CharSet letterSet(FcCharSetCreate());
    if (!config || !letterSet) return files;
    std::u32string missing(letters);
    for (const char32_t letter : missing) FcCharSetAddChar(letterSet.get(), letter);
    const Pattern wanted = request(faces[static_cast<int>(like)], "sans-serif");
    FcPatternAddCharSet(wanted.get(), FC_CHARSET, letterSet.get());
    complete(config.get(), wanted.get());
    FcResult result = FcResultNoMatch;
    const FontSet sorted(FcFontSort(config.get(), wanted.get(), FcFalse, nullptr, &result));
    for (int i = 0; sorted && i < sorted->nfont && !missing.empty(); ++i) {
        FcPattern* const font = sorted->fonts[i];
        FcCharSet* has = nullptr;
        if (!hasOutlines(font) || FcPatternGetCharSet(font, FC_CHARSET, 0, &has) != FcResultMatch) continue;
        if (std::erase_if(missing, [has](char32_t letter) { return FcCharSetHasChar(has, letter); }) > 0)
            files.push_back(fileOf(font));
    }
    return files;
}

QvFontFile QvPlatform::fontOf(const std::string& family, QvFontFace like) {
    needSpareMemory();
    const Config config(FcInitLoadConfigAndFonts());
    if (!config) return {};
    const Pattern wanted = request(faces[static_cast<int>(like)], family.c_str());
    complete(config.get(), wanted.get());
    FcResult result = FcResultNoMatch;
    const Pattern found(FcFontMatch(config.get(), wanted.get(), &result));
    if (!found || !hasOutlines(found.get())) return {};
    return isGeneric(family) || isAnswer(found.get(), wanted.get()) ? fileOf(found.get()) : QvFontFile();
}

std::vector<std::string> QvPlatform::fontFamilies() {
    needSpareMemory();
    std::vector<std::string> names;
    const Config config(FcInitLoadConfigAndFonts());
    if (!config) return names;
    const Pattern all(FcPatternCreate());
    const Objects asked(FcObjectSetBuild(FC_FAMILY, static_cast<char*>(nullptr)));
    const FontSet fonts(FcFontList(config.get(), all.get(), asked.get()));
    FcChar8* family = nullptr;
    for (int i = 0; fonts && i < fonts->nfont; ++i)
        if (FcPatternGetString(fonts->fonts[i], FC_FAMILY, 0, &family) == FcResultMatch)
            names.emplace_back(reinterpret_cast<const char*>(family));
    std::sort(names.begin(), names.end());
    names.erase(std::unique(names.begin(), names.end()), names.end());
    return names;
}
