#include "core/document/xmltrans.h"

#include <cmath>
#include <limits>

#include "core/measure/qvgeometry.h"
#include "tests/support/checks.h"
#include "tests/support/comma_locale.h"

namespace {

Any bytes(std::string_view text) {
    return Any(static_cast<const void*>(text.data()), static_cast<int>(text.size()));
}

std::unique_ptr<XmlNode> nodeOf(const Any& value) {
    auto node = std::make_unique<XmlNode>(nullptr);
    XmlTrans().AnyToXml(value, node.get());
    return node;
}

Any valueOf(const std::string& element) {
    const TempFolder folder;
    XmlParser parser;
    parser.parseFile(folder.write("a.xml", element).c_str());
    Any value("before");
    XmlTrans().XmlToAny(parser.topLevel(), value);
    return value;
}

struct Restored {
    int result;
    AnyDict dict{"old", 1};
    Any root, version;
};

Restored restored(const std::string& document) {
    const TempFolder folder;
    Restored r;
    r.result = XmlParser::restoreDict(folder.write("a.xml", document).c_str(), r.dict, r.root, r.version);
    return r;
}

TEST(XmlTrans, dataOfEachType) {
    const struct {
        Any value;
        const char *element, *data;
    } cases[] = {
        {Any(), "inv", ""},
        {Any(std::numeric_limits<int>::min()), "i32", "-2147483648"},
        {Any(std::numeric_limits<long long>::min()), "i64", "-9223372036854775808"},
        {Any(1.0 / 3), "fl", "0.333333"},
        {Any(std::numeric_limits<double>::infinity()), "fl", "inf"},
        {Any(u"\u00e9"), "wstr", "\xC3\xA9"},
        {bytes(std::string(10, '\xAB')), "gen", "10x AB "},
        {bytes("\x01\x02\x03"), "gen", "01 02 03 "},
        {bytes("\x05\x05\x06\x06\x06\xFF"), "gen", "05 05 3x 06 FF "},
        {Any(static_cast<const void*>("borrowed")), "gen", ""},
    };
    for (const auto& c : cases) {
        const auto node = nodeOf(c.value);
        EXPECT_STREQ(node->name(), c.element);
        EXPECT_EQ(std::string(node->data()), c.data);
        EXPECT_TRUE(node->attrs().empty());
    }
    EXPECT_EQ(nodeOf(AnyDict("#c", 1))->nrChildren(), 0) << "a comment of the program's";
}

TEST(XmlTrans, attributesOfEachType) {
    const struct {
        Any value;
        const char* element;
        AnyDict attributes;
    } cases[] = {
        {QvFramerate(QvRatio(30000, 1001), 2, true, 3), "framerate",
         AnyDict("num", "30000", "denom", "1001", "df", "1", "interlaced", "2", "pulldown", "3")},
        {QvPoint(-1, 2), "pt", AnyDict("x", "-1", "y", "2")},
        {QvRect(1, 2, 3, 4), "rect", AnyDict("left", "1", "top", "2", "right", "3", "bottom", "4")},
        {QvBitrate(1, 10, 20, 30, 40), "bitrate",
         AnyDict("type", "vbr", "target", "10", "min", "20", "max", "30", "mode", "40")},
        {QvBitrate(3), "bitrate", AnyDict("type", "cqt_strict")},
        {QvBitrate(4), "bitrate", AnyDict("type", "4")},
        {Pair(-5, 6), "pair", AnyDict("first", "-5", "second", "6")},
        {MediaTime(1LL << 60, 90000), "mediatime", AnyDict("ticks", "1152921504606846976", "scale", "90000")},
    };
    for (const auto& c : cases) {
        const auto node = nodeOf(c.value);
        EXPECT_STREQ(node->name(), c.element);
        EXPECT_EQ(node->attrs(), c.attributes) << c.element;
        Any back;
        XmlTrans().XmlToAny(node.get(), back);
        EXPECT_EQ(back, c.value) << c.element;
    }
}

TEST(XmlTrans, readsDamagedValues) {
    constexpr double infinity = std::numeric_limits<double>::infinity();
    const struct {
        const char* element;
        Any value;
    } cases[] = {
        {"<i32> \n\t+12 apples</i32>", Any(12)},
        {"<i32>99999999999999999999</i32>", Any(std::numeric_limits<int>::max())},
        {"<i32>-99999999999999999999</i32>", Any(std::numeric_limits<int>::min())},
        {"<fl>1e999</fl>", Any(infinity)},
        {"<fl>-1e99999999999999999999</fl>", Any(-infinity)},
        {"<fl>1e-999</fl>", Any(0.0)},
        {"<fl>-inf</fl>", Any(-infinity)},
        {"<str/>", Any("")},
        {"<gen>3x</gen>", bytes(std::string(2, 0))},
        {"<gen>-7x AA 1</gen>", bytes("\x01")},
        {"<gen>zz 1FF</gen>", bytes(std::string("\0\xFF", 2))},
        {"<pt x='1'/>", Any()},
        {"<pair second='2'/>", Pair(0, 2)},
        {"<bitrate type='7'/>", QvBitrate(7, 7)},
        {"<bitrate type='bad' max='9'/>", QvBitrate(0, 0, 0, 9)},
        {"<mediatime ticks='5' scale='0'/>", Any()},
        {"<framerate/>", QvFramerate(25.0)},
        {"<framerate num='1' denom='0'/>", QvFramerate(QvRatio(1, 0))},
        {"<vec><i32>1</i32><x><y/></x><str>s</str></vec>", AnyVector(1, Any(), "s")},
        {"<Foo name='lost'/>", AnyDict("__class__", "Foo")},
        {"<Foo><bar/></Foo>", Any()},
        {"<dict class='C' version='2' name='N'><x/><key>k</key></dict>",
         AnyDict("__class__", "C", "__version__", "2", "name", "N")},
        {"<dict><key>k</key><i32>1</i32><stray/><key>k</key><str>2</str></dict>", AnyDict("k", "2")},
        {"<dict><ent><key>a</key><i32>1</i32></ent><ent><key>b</key><val><i32>2</i32></val></ent>"
         "<ent><key>c</key></ent><ent><key>d</key><val/></ent></dict>",
         AnyDict("a", 1, "b", 2)},
    };
    for (const auto& c : cases) EXPECT_EQ(valueOf(c.element), c.value) << c.element;
    EXPECT_TRUE(std::isnan(valueOf("<fl>NaN</fl>").asFloat()));
    EXPECT_TRUE(valueOf("<framerate denom='1' df='1'/>").asFramerate().df());
}

TEST(XmlTrans, hostileTextsSurviveStoringAndRestoringInEveryPlace) {
    const TempFolder folder;
    const std::string file = folder.file("1.xml"), again = folder.file("2.xml");
    const Any texts[] = {"",   " ",  "\n\tz ", "<&>\"'", "]]>", "##",  "_",   "\xC3\xA9\xF0\x9F\x8E\xAC",
                         "%s", "42", "key",    "ent",    "val", "vec", "Foo", "a b"};
    for (const Any& text : texts)
        for (const Any& version : {Any(), Any("7"), Any(Pair(7, 8))}) {
            const Any attribute = text == "\n\tz " ? Any("z") : text;  // XML makes line ends there spaces
            AnyDict inner("some", QvPoint(-1, 2), "__class__", attribute, "name", attribute),
                plain("none", Any());
            if (version.isValid()) inner.set("__version__", version);
            plain.set(Any::strcat("k", text).asString(),
                      AnyVector(text, bytes("\1\1\1"), inner, AnyVector()));
            if (text != "##") plain.set(text.asString(), text.toWString());
            const AnyDict dict("__class__", "Root", "__version__", "2", "in", inner, "p", AnyVector(1, plain),
                               "name", 5);
            ASSERT_EQ(XmlParser::storeDict(file.c_str(), dict), 0);
            AnyDict back;
            Any root, found;
            ASSERT_EQ(XmlParser::restoreDict(file.c_str(), back, root, found), 0);
            EXPECT_EQ(back, dict) << TempFolder::read(file);
            ASSERT_EQ(XmlParser::storeDict(again.c_str(), back), 0);
            EXPECT_EQ(TempFolder::read(file), TempFolder::read(again));
        }
}

TEST(XmlTrans, numbersIgnoreTheLocale) {
    const CommaLocale locale;
    if (!locale.active()) GTEST_SKIP() << "no locale with a decimal comma can be made";
    EXPECT_EQ(nodeOf(1.5)->rawData(), "1.500000");
    EXPECT_EQ(valueOf("<fl>1.25</fl>"), 1.25);
}

TEST(XmlTrans, deepestDocument) {
    std::string open, close;
    for (int i = 1; i < XmlParser::maxDepth; ++i) {
        open += i % 2 ? "<key>k</key><dict>" : "<key>k</key><Foo>";
        close.insert(0, i % 2 ? "</dict>" : "</Foo>");
    }
    const Restored r = restored("<Root version='1'>" + open + close + "</Root>");
    ASSERT_EQ(r.result, 0);
    const TempFolder folder;
    EXPECT_EQ(XmlParser::storeDict(folder.file("a.xml").c_str(), r.dict), 0);
    EXPECT_EQ(restored(TempFolder::read(folder.file("a.xml"))).dict, r.dict);
}

TEST(StoreDict, classAndVersion) {
    const struct {
        AnyDict dict;
        const char* className;
        Any version;
        std::string start;  // of the root element; empty: refused
    } cases[] = {
        {AnyDict("a", 1), "C", Any(1.5), "<C version=\"1.500000\">"},
        {AnyDict("a", 1), "C", Any(0), "<C version=\"2.0\">"},
        {AnyDict("a", 1), "C", Pair(1, 2), "<C version=\"2.0\">"},
        {AnyDict("__class__", "D", "__version__", 4), nullptr, Any(), "<D version=\"4\"/>"},
        {AnyDict("__class__", "D"), "C", Any(), "<C class=\"D\" version=\"2.0\"/>"},
        {AnyDict("a", 1), nullptr, Any(), ""},
        {AnyDict("__class__", 5), nullptr, Any(), ""},
    };
    const TempFolder folder;
    for (const auto& c : cases) {
        const std::string file = folder.file("a.xml");
        const int result = XmlParser::storeDict(file.c_str(), c.dict, c.className, c.version);
        EXPECT_EQ(result, c.start.empty() ? -1 : 0) << c.start;
        if (c.start.empty()) continue;
        const std::string name = c.start.substr(1, 1);
        const std::string head =
            "<?xml version=\"1.0\" encoding=\"UTF-8\" ?>\n<!DOCTYPE " + name + ">\n" + c.start;
        EXPECT_EQ(TempFolder::read(file).substr(0, head.size()), head);
    }
    EXPECT_THROW(XmlParser::storeDict("/nowhere/a.xml", AnyDict("a", 1), "C"), QvFileException);
}

TEST(RestoreDict, resultsAndSideResults) {
    Restored r = restored("<Root version='3' class='Other'><key>a</key><i32>1</i32></Root>");
    EXPECT_EQ(r.result, 0);
    EXPECT_EQ(r.dict, AnyDict("__class__", "Root", "__version__", "3", "a", 1));
    EXPECT_TRUE(r.root == "Root" && r.version == "3");

    EXPECT_EQ(restored("<Root version='3'><dict><key>a</key><i32>1</i32></dict></Root>").dict,
              AnyDict("__class__", "Root", "a", 1));
    r = restored("<Root/>");
    EXPECT_TRUE(r.result == -1 && r.root == "Root" && r.version == Any(-1) && r.dict.empty());

    r = restored("<Root><key>");
    EXPECT_TRUE(r.result == -1 && r.root == Any() && r.version == Any(-1) && r.dict.empty());
    EXPECT_EQ(XmlParser::restoreDict("/nowhere/a.xml", r.dict, r.root, r.version), -1);
}

// Of small elements that are large as dictionaries there may be some, or many if they are not all there is.
TEST(RestoreDict, limitsTheDictionariesOfADocument) {
    const struct {
        const char* each;
        int count, result;
    } cases[] = {{"<a/>", XmlParser::maxObjects - 1, 0},  // with the root
                 {"<a/>", XmlParser::maxObjects, -1},
                 {"<a/><vec></vec><vec></vec>", 2 * XmlParser::maxObjects, 0},
                 {"<vec/>", 10 * XmlParser::maxObjects, 0}};
    for (const auto& c : cases) {
        std::string text = "<R><key>v</key><vec>";
        for (int i = 0; i < c.count; ++i) text += c.each;
        Restored r = restored(text + "</vec></R>");
        EXPECT_EQ(r.result, c.result) << c.each;
        EXPECT_EQ(r.dict.isSet("v"), c.result == 0) << c.each;
    }
}

TEST(XmlTransCustomDict, compactFormAndBack) {
    AnyDict dict("__class__", "Clip", "__version__", "1", "name", "N", "#note", "kept", "n", 1, "v",
                 AnyVector(1, AnyDict("x", 2)), "none", Any(), "rate", QvFramerate::f25p());
    XmlNode node(nullptr);
    XmlTransCustomDict().AnyToXml(dict, &node);
    EXPECT_STREQ(node.name(), "Clip");
    EXPECT_EQ(node.attrs(), AnyDict("version", "1", "name", "N"));
    EXPECT_TRUE(node.child("n")->getAttr("type") == "i32" && node.child("n")->rawData() == "1");
    EXPECT_EQ(node.child("v")->child(1)->child("x")->getAttr("type"), "i32");
    AnyDict back;
    XmlTransCustomDict().XmlToDict(&node, back);
    EXPECT_EQ(back, dict);
}

TEST(XmlTransCustomDict, readsBothFormsAndRefusesUntypedEntries) {
    const auto read = [](XmlNode& node) {
        AnyDict dict;
        XmlTransCustomDict().XmlToDict(&node, dict);
        return dict;
    };
    XmlNode plain(nullptr);
    XmlTrans().DictToXml(AnyDict("__class__", "C", "a", 1), &plain);
    EXPECT_EQ(read(plain), AnyDict("__class__", "C", "a", 1));

    XmlNode nested(nullptr);
    XmlTransCustomDict().DictToXml(AnyDict("sub", AnyDict("x", 1)), &nested);
    EXPECT_EQ(read(nested), AnyDict("sub", AnyDict("__class__", "sub", "x", 1)));
}

}  // namespace
