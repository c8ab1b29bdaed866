#include "core/arch/widename.h"

#include "tests/support/checks.h"

namespace {

std::vector<unsigned> units(std::string_view bytes) {
    const QvWideString wide = qv_wide_name(bytes);
    return {wide.begin(), wide.end()};
}

std::string bytes(const std::vector<unsigned short>& wide) {
    return qv_narrow_name(wide.data(), wide.size());
}

using Units = std::vector<unsigned>;

TEST(WideName, StrayBytesBecomeEscapesAndWellFormedTextItsUnits) {
    const struct {
        std::string_view bytes;
        Units units;
    } cases[] = {
        {"a\xC3\xA9", {'a', 0xE9}},
        {"\xF0\x9F\x8E\xAC", {0xD83C, 0xDFAC}},
        {"\xFF", {0xDCFF}},
        {"\xC3(", {0xDCC3, '('}},
        {"\xE2\x82", {0xDCE2, 0xDC82}},                          // cut off
        {"\xC0\xAF", {0xDCC0, 0xDCAF}},                          // "/" in two bytes
        {"\xED\xB2\x80", {0xDCED, 0xDCB2, 0xDC80}},              // an escape, encoded
        {"\xF4\x90\x80\x80", {0xDCF4, 0xDC90, 0xDC80, 0xDC80}},  // above U+10FFFF
    };
    for (const auto& c : cases) {
        EXPECT_EQ(units(c.bytes), c.units) << testing::PrintToString(c.bytes);
        const QvWideString wide = qv_wide_name(c.bytes);
        EXPECT_EQ(qv_narrow_name(wide.data(), wide.size()), c.bytes);
    }
}

TEST(WideName, LoneSurrogatesThatNameNoByteKeepTheirUnitsApart) {
    EXPECT_EQ(bytes({0xD800}), "\xED\xA0\x80");
    EXPECT_EQ(bytes({'x', 0xDC7F}), "x\xED\xB1\xBF");
    EXPECT_EQ(bytes({0xD83C, 0xD83C, 0xDFAC}), "\xED\xA0\xBC\xF0\x9F\x8E\xAC");
    EXPECT_EQ(bytes({}), "");
}

}  // namespace
