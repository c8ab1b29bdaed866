#include "core/caption/qvtextrenderingoptions.h"

#include <gtest/gtest.h>

namespace {

TEST(TextRenderingOptions, WhatIsStoredComesBack) {
    QvTextRenderingOptions options;
    options.fontRegular = "a.ttf";
    options.fontBold = "b.ttf";
    options.charSize = 20;
    options.subEncoding = QvTextRenderingOptions::byCodePage;
    options.codePage = 1256;
    options.multibyteType = 3;
    options.fontEffect = QvTextRenderingOptions::hardShadow;
    AnyDict stored;
    options.store(stored);
    EXPECT_EQ(stored, AnyDict("fontdir_regular", "a.ttf", "fontdir_bold", "b.ttf", "charSizePt", 20,
                              "subEncoding", 4, "codePage", 1256, "multibyteType", 3, "fontEffect", 3));
    QvTextRenderingOptions other;
    other.fontItalic = "kept.ttf";
    other.restore(stored);
    EXPECT_EQ(other.fontItalic, "kept.ttf");
    other.fontItalic.invalidate();
    AnyDict again;
    other.store(again);
    EXPECT_EQ(again, stored);
}

TEST(TextRenderingOptions, WrongTypesLeaveTheDefaults) {
    QvTextRenderingOptions options;
    options.restore(AnyDict("charSizePt", "huge", "fontdir_regular", 5, "fontEffect", 1.0));
    AnyDict stored;
    options.store(stored);
    EXPECT_EQ(stored, AnyDict("charSizePt", 50, "subEncoding", 0, "codePage", 0, "multibyteType", 0,
                              "fontEffect", 0));
    EXPECT_STREQ(QvTextRenderingOptions::effectName(2), "Outline w/ shadow");
    EXPECT_STREQ(QvTextRenderingOptions::effectName(4), "");
}

}  // namespace
