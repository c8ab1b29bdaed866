#include "core/caption/text/qvtextrenderingoptions.h"

namespace {

constexpr struct {
    const char* key;
    Any QvTextRenderingOptions::*field;
} fontRows[] = {
    {"fontdir_regular", &QvTextRenderingOptions::fontRegular},
    {"fontdir_italic", &QvTextRenderingOptions::fontItalic},
    {"fontdir_bold", &QvTextRenderingOptions::fontBold},
};

struct NumberRow {
    const char* key;
    int QvTextRenderingOptions::*field;
};
constexpr NumberRow numberRows[] = {
    {"charSizePt", &QvTextRenderingOptions::charSize},
    {"subEncoding", &QvTextRenderingOptions::subEncoding},
    {"codePage", &QvTextRenderingOptions::codePage},
    {"multibyteType", &QvTextRenderingOptions::multibyteType},
    {"fontEffect", &QvTextRenderingOptions::fontEffect},
};

// Stored unless they are 0.
constexpr NumberRow layoutRows[] = {
    {"align", &QvTextRenderingOptions::align},
    {"marginX", &QvTextRenderingOptions::marginX},
    {"marginY", &QvTextRenderingOptions::marginY},
};

constexpr const char* effectNames[] = {
    "No effect",
    "Outline",
    "Outline w/ shadow",
    "Outline w/ hard shadow",
};
static_assert(std::size(effectNames) == QvTextRenderingOptions::nrEffects);

}  // namespace

void QvTextRenderingOptions::store(AnyDict& dict) const {
    for (const auto& row : fontRows)
        if ((this->*row.field).isText()) dict.set(row.key, this->*row.field);
    for (const auto& row : numberRows) dict.set(row.key, Any(this->*row.field));
    if (pixelAspect != 1) dict.set("pixelAspect", pixelAspect);
    if (fontFamily.isText()) dict.set("fontFamily", fontFamily);
    if (wrap) dict.set("wrap", 1);
    for (const auto& row : layoutRows)
        if (this->*row.field != 0) dict.set(row.key, Any(this->*row.field));
}

void QvTextRenderingOptions::restore(const AnyDict& dict) {
    for (const auto& row : fontRows)
        if (dict[row.key].isText()) this->*row.field = dict[row.key];
    for (const auto& row : numberRows) this->*row.field = dict.getInt32(row.key, this->*row.field);
    pixelAspect = dict.getDouble("pixelAspect", pixelAspect);
    if (dict["fontFamily"].isText()) fontFamily = dict["fontFamily"];
    wrap = dict.getInt32("wrap", wrap) != 0;
    for (const auto& row : layoutRows) this->*row.field = dict.getInt32(row.key, this->*row.field);
}

const char* QvTextRenderingOptions::effectName(int effect) {
    return effect >= 0 && effect < nrEffects ? effectNames[effect] : "";
}
