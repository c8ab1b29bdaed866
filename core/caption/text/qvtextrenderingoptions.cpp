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

constexpr struct {
    const char* key;
    int QvTextRenderingOptions::*field;
} numberRows[] = {
    {"charSizePt", &QvTextRenderingOptions::charSize},
    {"subEncoding", &QvTextRenderingOptions::subEncoding},
    {"codePage", &QvTextRenderingOptions::codePage},
    {"multibyteType", &QvTextRenderingOptions::multibyteType},
    {"fontEffect", &QvTextRenderingOptions::fontEffect},
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
}

void QvTextRenderingOptions::restore(const AnyDict& dict) {
    for (const auto& row : fontRows)
        if (dict[row.key].isText()) this->*row.field = dict[row.key];
    for (const auto& row : numberRows) this->*row.field = dict.getInt32(row.key, this->*row.field);
    pixelAspect = dict.getDouble("pixelAspect", pixelAspect);
}

const char* QvTextRenderingOptions::effectName(int effect) {
    return effect >= 0 && effect < nrEffects ? effectNames[effect] : "";
}
