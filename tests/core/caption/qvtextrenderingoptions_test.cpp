#include "core/caption/qvtextrenderingoptions.h"

#include <gtest/gtest.h>

namespace {

TEST(TextRenderingOptions, StoredFormKeepsDefaultsForWhatIsMissingOrWrong) {
    QvTextRenderingOptions options;
    options.restore(AnyDict("charSizePt", "huge", "fontdir_regular", 5, "fontEffect", 1.0));
    AnyDict stored;
    options.store(stored);
    EXPECT_EQ(stored, AnyDict("charSizePt", 50, "subEncoding", 0, "codePage", 0, "multibyteType", 0,
                              "fontEffect", 0));
    AnyDict all("fontdir_regular", "a.ttf", "fontdir_bold", "b.ttf", "charSizePt", 20, "subEncoding", 4,
                "codePage", 1256);
    all.set("fontdir_italic", u"c.ttf");
    all.set("multibyteType", 3);
    all.set("fontEffect", 2);
    options.restore(all);
    options.store(stored);
    EXPECT_EQ(stored, all);
    EXPECT_STREQ(QvTextRenderingOptions::effectName(options.fontEffect), "Outline w/ shadow");
    EXPECT_STREQ(QvTextRenderingOptions::effectName(4), "");
}

}  // namespace
