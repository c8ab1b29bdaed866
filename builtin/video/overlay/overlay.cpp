#include "builtin/video/overlay/overlay.h"

#include "core/caption/text/qvtext.h"
#include "core/caption/text/qvtextrenderingoptions.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"

namespace {

void warnOf(const Any& font) {
    if (font.isText() && QvFile::isFile(font) && QvText::isFont(font)) return;
    const Any name = font.toString();
    if (font.isTrue())
        qv_log()->warning("The font %s can't be read: text in it is not drawn", name.asString(""));
    else
        qv_log()->warning("No font was found: text is not drawn");
}

}  // namespace

bool overlay::canDrawOn(const QvFrame& frame) {
    return frame.four_cc() != QvFourcc::v210 && frame.four_cc() != QvFourcc::I422;
}

void overlay::warnOfFonts(const QvTextRenderingOptions& options) {
    const Any &regular = options.fontRegular, &italic = options.fontItalic, &bold = options.fontBold;
    warnOf(regular);
    if (italic.isText() && italic != regular) warnOf(italic);
    if (bold.isText() && bold != regular && bold != italic) warnOf(bold);
}
