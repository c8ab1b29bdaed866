#include "core/value/xmltrans.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <limits>
#include <memory>
#include <random>
#include <string>
#include <vector>

#include "core/engine/qvexception.h"
#include "core/media/qvgeometry.h"
#include "tests/core/value/value_support.h"
#include "tests/support/log_capture.h"
#include "tests/support/temp_folder.h"

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
        {Any(-1e15), "fl", "-1000000000000000.000000"},
        {Any(std::numeric_limits<double>::infinity()), "fl", "inf"},
        {Any(" a\t"), "str", " a\t"},
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
    constexpr int max32 = std::numeric_limits<int>::max();
    constexpr double infinity = std::numeric_limits<double>::infinity();
    const struct {
        const char* element;
        Any value;
    } cases[] = {
        {"<i32> \n\t+12 apples</i32>", Any(12)},
        {"<i32>-</i32>", Any(0)},
        {"<i32>+-3</i32>", Any(0)},
        {"<i32/>", Any(0)},
        {"<i32>99999999999999999999</i32>", Any(max32)},
        {"<i32>-99999999999999999999</i32>", Any(std::numeric_limits<int>::min())},
        {"<i64>12345678901234567890</i64>", Any(std::numeric_limits<long long>::max())},
        {"<i64>NaN</i64>", Any(0LL)},
        {"<fl>1e999</fl>", Any(infinity)},
        {"<fl>-1e99999999999999999999</fl>", Any(-infinity)},
        {"<fl>1e-999</fl>", Any(0.0)},
        {"<fl>0.0001e-100000</fl>", Any(0.0)},
        {"<fl> 1,5</fl>", Any(1.0)},
        {"<fl>.5e1x</fl>", Any(5.0)},
        {"<fl>-inf</fl>", Any(-infinity)},
        {"<fl>none</fl>", Any(0.0)},
        {"<str/>", Any("")},
        {"<wstr>x</wstr>", Any(u"x")},
        {"<inv>x</inv>", Any()},
        {"<gen>3x</gen>", bytes(std::string(2, 0))},
        {"<gen>-7x AA 1</gen>", bytes("\x01")},
        {"<gen>2x 3x 0F 7</gen>", bytes(std::string("\x03\x03\x0F\x07\0", 5).substr(0, 5))},
        {"<gen>zz 1FF</gen>", bytes(std::string("\0\xFF", 2))},
        {"<pt x='1'/>", Any()},
        {"<rect left='1' top='2' right='3'/>", Any()},
        {"<pair second='2'/>", Pair(0, 2)},
        {"<bitrate target='5'/>", Any()},
        {"<bitrate type='7'/>", QvBitrate(7, 7)},
        {"<bitrate type='bad' max='9'/>", QvBitrate(0, 0, 0, 9)},
        {"<mediatime ticks='5'/>", Any()},
        {"<mediatime ticks='5' scale='0'/>", Any()},
        {"<mediatime scale='25'/>", MediaTime(0, 25)},
        {"<framerate/>", QvFramerate(25.0)},
        {"<framerate num='1' denom='0'/>", QvFramerate(QvRatio(1, 0))},
        {"<vec><i32>1</i32><x><y/></x><str>s</str></vec>", AnyVector(1, Any(), "s")},
        {"<Foo/>", AnyDict("__class__", "Foo")},
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
    EXPECT_EQ(valueOf("<framerate num='50' df='1'/>").asFramerate().df(), true);
}

TEST(XmlTrans, missingPartsOfARateAreLogged) {
    const LogCapture log;
    valueOf("<framerate denom='1' df='0'/>");
    EXPECT_TRUE(log.contains("[xmlnode] Invalid framerate node, missing'num'", 32));
    EXPECT_TRUE(log.contains("[xmlnode] Invalid framerate node, missing 'pulldown'", 32));
    EXPECT_FALSE(log.contains("'denom'"));
}

TEST(XmlTrans, placeOfTheClass) {
    const struct {
        AnyDict dict;
        const char *given, *name, *attribute;
    } cases[] = {
        {AnyDict("__class__", "Foo"), nullptr, "Foo", nullptr},
        {AnyDict("__class__", "Foo"), "Foo", "Foo", nullptr},
        {AnyDict("__class__", "Foo"), "Bar", "Bar", "Foo"},
        {AnyDict("__class__", "i32"), nullptr, "dict", "i32"},
        {AnyDict("__class__", "a b"), nullptr, "dict", "a b"},
        {AnyDict("#c", 1), nullptr, "dict", nullptr},
    };
    for (const auto& c : cases) {
        XmlNode node(c.given);
        XmlTrans().DictToXml(c.dict, &node);
        EXPECT_STREQ(node.name(), c.name);
        EXPECT_STREQ(node.attrs().getString("class"), c.attribute);
        EXPECT_EQ(node.nrChildren(), 0);
    }
}

// Random values that a document can hold without loss.
class RandomValues {
  public:
    explicit RandomValues(unsigned seed) : random_(seed) {}

    Any value(int depth) {
        switch (number(depth > 0 ? 15 : 13)) {
            case 0: return Any();
            case 1: return Any(integer());
            case 2: return Any(static_cast<long long>(random_()) << 32 | integer());
            case 3: return Any(integer() / 64.0);
            case 4: return Any(text().c_str());
            case 5: return Any(text().c_str()).toWString();
            case 6: return bytes(runs());
            case 7:
                return QvFramerate(QvRatio(1 + number(60000), 1 + number(1001)), number(3), number(2) == 1);
            case 8: return QvPoint(integer(), integer());
            case 9: return QvRect(integer(), integer(), integer(), integer());
            case 10: return QvBitrate(number(6), integer(), integer(), integer(), integer());
            case 11: return Pair(integer(), integer());
            case 12: return MediaTime(static_cast<long long>(random_()) << 30, 1 + number(1 << 30));
            case 13: return vector(depth - 1);
            default: return dict(depth - 1);
        }
    }

    AnyVector vector(int depth) {
        AnyVector result;
        for (int i = number(5); i > 0; --i) result.append(value(depth));
        return result;
    }

    AnyDict dict(int depth) {
        AnyDict result("some", value(0));  // with a class alone, the attributes of an element are not read
        for (int i = number(6); i > 0; --i) {
            const std::string key = text();
            if (!key.starts_with('#')) result.set(key.c_str(), value(depth));
        }
        if (number(2)) result.set("__class__", classes[static_cast<std::size_t>(number(5))]);
        if (number(2)) result.set("__version__", number(2) ? Any("7") : Any(Pair(7, 8)));
        if (number(2)) result.set("name", number(2) ? Any("n<>") : Any(5));
        return result;
    }

  private:
    static constexpr const char* classes[] = {"Foo", "a b", "key", "\xC3\xA4", "vec"};
    std::mt19937 random_;

    int number(int bound) { return static_cast<int>(random_() % static_cast<unsigned>(bound)); }
    int integer() { return static_cast<int>(random_()); }
    // Ends before a key would be cut. No carriage return: XML turns it into a line feed.
    std::string text() {
        static constexpr const char* parts[] = {
            "a", "Z",  "7", " ", "\n", "\t",  "<",        ">",
            "&", "\"", "'", "#", "_",  "]]>", "\xC3\xA9", "\xF0\x9F\x8E\xAC",
            "%s"};
        std::string result;
        for (int i = number(10); i > 0; --i) result += parts[random_() % std::size(parts)];
        return result;
    }
    std::string runs() {
        std::string result(1, static_cast<char>(random_()));
        for (int i = number(8); i > 0; --i)
            result.append(static_cast<std::size_t>(number(6)), static_cast<char>(random_()));
        return result;
    }
};

TEST(XmlTrans, randomDictionariesSurviveStoringAndRestoring) {
    const TempFolder folder;
    const std::string first = folder.file("1.xml"), second = folder.file("2.xml");
    for (unsigned seed = 0; seed < 300; ++seed) {
        AnyDict dict = RandomValues(seed).dict(4);
        dict.set("__class__", "Root");  // any other does not outlive the root's name
        ASSERT_EQ(XmlParser::storeDict(first.c_str(), dict), 0);
        AnyDict back;
        Any root, version;
        ASSERT_EQ(XmlParser::restoreDict(first.c_str(), back, root, version), 0);
        ASSERT_EQ(XmlParser::storeDict(second.c_str(), back), 0);
        ASSERT_EQ(TempFolder::read(first), TempFolder::read(second)) << "seed " << seed;
        if (!dict.get("__version__").isPair()) dict.set("__version__", version);
        ASSERT_EQ(back, dict) << "seed " << seed << "\n" << TempFolder::read(first);
    }
}

TEST(XmlTrans, numbersIgnoreTheLocale) {
    const CommaLocale locale;
    if (!locale.active()) GTEST_SKIP() << "no locale with a decimal comma can be made";
    EXPECT_EQ(nodeOf(1.5)->rawData(), "1.500000");
    EXPECT_EQ(valueOf("<fl>1.25</fl>"), 1.25);
    const TempFolder folder;
    XmlParser::storeDict(folder.file("a.xml").c_str(), AnyDict("a", 0.5), "C", Any(2.5));
    EXPECT_NE(TempFolder::read(folder.file("a.xml")).find("version=\"2.500000\""), std::string::npos);
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
        {AnyDict("a", 1), "C", Any(3), "<C version=\"3\">"},
        {AnyDict("a", 1), "C", Any(1LL << 40), "<C version=\"1099511627776\">"},
        {AnyDict("a", 1), "C", Any(1.5), "<C version=\"1.500000\">"},
        {AnyDict("a", 1), "C", Any("x"), "<C version=\"x\">"},
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
    const LogCapture log;
    Restored r = restored("<Root version='3' class='Other'><key>a</key><i32>1</i32></Root>");
    EXPECT_EQ(r.result, 0);
    EXPECT_EQ(r.dict, AnyDict("__class__", "Root", "__version__", "3", "a", 1));
    EXPECT_TRUE(r.root == "Root" && r.version == "3");
    EXPECT_TRUE(log.contains("XmlParser.restoreDict: parseFile ", 32) && log.contains("toAny ", 32));

    EXPECT_EQ(restored("<Root version='3'><dict><key>a</key><i32>1</i32></dict></Root>").dict,
              AnyDict("__class__", "Root", "a", 1));

    r = restored("<Root/>");
    EXPECT_TRUE(r.result == -1 && r.root == "Root" && r.version == Any(-1) && r.dict.empty());
    EXPECT_TRUE(log.contains("holds no entries"));

    r = restored("<Root><key>");
    EXPECT_TRUE(r.result == -1 && r.root == Any() && r.version == Any(-1) && r.dict.empty());
    EXPECT_TRUE(log.contains("no element found at line 1"));
    EXPECT_EQ(XmlParser::restoreDict("/nowhere/a.xml", r.dict, r.root, r.version), -1);
}

TEST(XmlTransCustomDict, compactFormAndBack) {
    AnyDict dict("__class__", "Clip", "__version__", "1", "name", "N", "#note", "kept", "n", 1, "v",
                 AnyVector(1, AnyDict("x", 2)), "none", Any(), "rate", QvFramerate::f25p());
    XmlNode node(nullptr);
    XmlTransCustomDict().AnyToXml(dict, &node);
    EXPECT_STREQ(node.name(), "Clip");
    EXPECT_EQ(node.attrs(), AnyDict("version", "1", "name", "N"));
    EXPECT_TRUE(node.child("n")->getAttr("type") == "i32" && node.child("n")->rawData() == "1");
    EXPECT_EQ(node.child("#note")->getAttr("type"), "str");
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

    XmlNode odd("dict");
    XmlNode* const entry = new XmlNode("k", nullptr, &odd, "1");
    EXPECT_EQ(failureOf([&] { read(odd); }), "");
    entry->setAttr("type", "nonsense");
    EXPECT_EQ(read(odd), AnyDict("k", Any()));
    odd.setName(nullptr);
    EXPECT_EQ(failureOf([&] { read(odd); }), "from->name()");
}

}  // namespace
