#include "core/document/xmldom.h"

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <fstream>

#include "tests/support/checks.h"
#include "tests/support/child.h"

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
#define QV_SANITIZED 1
#elif defined(__has_feature)
#if __has_feature(address_sanitizer) || __has_feature(thread_sanitizer)
#define QV_SANITIZED 1
#endif
#endif
#ifndef QV_SANITIZED
#define QV_SANITIZED 0
#endif

namespace {

// What parsing fails with, without the file's name.
std::string parseFailure(const std::string& document, XmlParser* parser = nullptr) {
    const TempFolder folder;
    XmlParser own;
    const std::string file = folder.write("a.xml", document), start = "Error in xml file " + file + " ";
    const std::string text = failureOf([&] { (parser ? parser : &own)->parseFile(file.c_str()); });
    return text.starts_with(start) ? text.substr(start.size()) : text;
}

std::string written(const XmlNode& node, int indent = 0) {
    const std::unique_ptr<std::FILE, int (*)(std::FILE*)> file(std::tmpfile(), std::fclose);
    EXPECT_EQ(node.write(file.get(), indent), 0);
    std::string text(static_cast<std::size_t>(std::ftell(file.get())), 0);
    std::rewind(file.get());
    EXPECT_EQ(std::fread(text.data(), 1, text.size(), file.get()), text.size());
    return text;
}

TEST(XmlNode, dataGrowsAndFormats) {
    const char* attrs[] = {"b", "2", "a", "\xC3\xA9", nullptr};
    XmlNode node("n", attrs, nullptr, "abc");
    node.addRawData("defgh", 2);
    EXPECT_EQ(node.rawData(), "abcde");
    const std::string longText(2000, 'x');
    node.sprintf("%s", longText.c_str());
    EXPECT_EQ(node.dataSize(), 511);
    node.addRawData(longText.c_str());
    EXPECT_EQ(node.dataSize(), 2511);
    node.sprintf("%s%d", longText.c_str(), 12);
    EXPECT_EQ(node.dataSize(), 2002);  // more room since the data has grown
}

TEST(XmlNode, namespacesOfOneColonAreStripped) {
    for (const bool recursive : {false, true}) {
        XmlNode root("a:b");
        new XmlNode("e", nullptr, new XmlNode("c:d", nullptr, &root));
        new XmlNode("f:g:h", nullptr, &root);
        root.stripXMLNamespace(recursive);
        const std::string inner = recursive ? "d" : "c:d";
        EXPECT_EQ(written(root), "<b>\n  <" + inner + ">\n    <e/>\n  </" + inner + ">\n  <f:g:h/>\n</b>\n");
    }
}

TEST(XmlNode, writtenForm) {
    XmlNode root("r");
    EXPECT_EQ(written(root), "<r/>\n");
    root.setAttr("b", "<&>\"'");
    root.setAttr("a", Any(u"\u00e9\U0001F3AC"));
    XmlNode* const leaf = new XmlNode("leaf", nullptr, &root, "a<b");
    new XmlNode(nullptr, nullptr, &root, "lost");
    new XmlNode("empty", nullptr, new XmlNode("inner", nullptr, &root));
    root.addRawData("own");
    EXPECT_EQ(written(root, 1),
              "  <r a=\"\xC3\xA9\xF0\x9F\x8E\xAC\" b=\"&lt;&amp;&gt;&quot;&apos;\">\n"
              "    <leaf>a&lt;b</leaf>\n"
              "    <inner>\n"
              "      <empty/>\n"
              "    </inner>\n"
              "own  </r>\n");
    leaf->sprintf("%s", "a\x01\xFF\tz");
    EXPECT_EQ(written(*leaf), "<leaf>a\xEF\xBF\xBD\xEF\xBF\xBD\tz</leaf>\n");
    root.setName(nullptr);
    EXPECT_EQ(root.write(stdout, 0), -1);
}

TEST(XmlParser, buildsTheTree) {
    XmlParser parser;
    const std::string document =
        "<?xml version=\"1.0\"?>\n<!DOCTYPE r SYSTEM \"nowhere.dtd\">\n<!-- c --><r k='&lt;&#233;'>x<a></a>\n"
        "y<![CDATA[<&>]]><b><c/></b></r>";
    EXPECT_EQ(parseFailure(document, &parser), "no failure");
    const XmlNode& root = *parser.topLevel();
    EXPECT_STREQ(root.name(), "r");
    EXPECT_EQ(root.getAttr("k"), Any(u"<\u00e9"));
    EXPECT_EQ(root.rawData(), "x\ny<&>");
    EXPECT_STREQ(root.child("b")->child(0)->name(), "c");
    EXPECT_EQ(root.child("a")->rawData(), "");
    EXPECT_EQ(parseFailure("<other \xC3\xA4='1'><\xC3\xA4/></other>", &parser), "no failure");
    EXPECT_EQ(parser.topLevel()->getAttr("\xC3\xA4"), "1");
    EXPECT_STREQ(parser.topLevel()->child(0)->name(), "\xC3\xA4");
    EXPECT_EQ(parseFailure("<a><b></a>", &parser), "mismatched tag at line 1");
    EXPECT_EQ(parser.topLevel(), nullptr);
}

TEST(XmlParser, blocksOfTheReader) {
    for (int size : {63999, 64000, 64001, 128000}) {
        XmlParser parser;
        parseFailure("<a>" + std::string(static_cast<std::size_t>(size - 7), 'x') + "</a>", &parser);
        EXPECT_EQ(parser.topLevel()->dataSize(), size - 7);
    }
}

TEST(XmlParser, damagedDocumentsTellReasonAndLine) {
    const struct {
        std::string document, failure;
    } cases[] = {
        {"", "no element found at line 1"},
        {"\n\n<a>\n<b>", "no element found at line 4"},
        {"<a>\n<b>\n</a>", "mismatched tag at line 3"},
        {std::string("<a>x\0y</a>", 10), "not well-formed (invalid token) at line 1"},
        {"<?xml version='1.0' encoding='x-none'?><a/>", "unknown encoding at line 1"},
        {"<a>\n&nothing;</a>", "undefined entity at line 2"},
        {"<!DOCTYPE a SYSTEM 'x.dtd'>\n<a>&nothing;</a>", "undefined entity at line 2"},
        {"<!DOCTYPE a [\n<!ENTITY x \"ha\">\n<!ENTITY y \"&x;&x;\">]>\n<a>&y;</a>",
         "entity declarations are not allowed at line 2"},
        {"<!DOCTYPE a [<!ENTITY x SYSTEM 'file:///etc/passwd'>]><a>&x;</a>",
         "entity declarations are not allowed at line 1"},
        {"<!DOCTYPE a [<!ENTITY % p SYSTEM 'file:///etc/passwd'> %p;]><a/>",
         "entity declarations are not allowed at line 1"},
        {"<!DOCTYPE a [<!NOTATION n SYSTEM 'n'><!ENTITY x SYSTEM 'y' NDATA n>]><a/>",
         "entity declarations are not allowed at line 1"},
        {repeated("<a>", 1000000), "elements nested too deep at line 1"},
        {repeated("<a>", 1001) + repeated("</a>", 1001), "elements nested too deep at line 1"},
        {"<a b='" + std::string(20 << 20, 'x') + "'/>", "element or declaration too long at line 1"},
        {"<!DOCTYPE a [<!ATTLIST a b CDATA '" + std::string(1 << 20, 'x') + "'>]><r>" +
             repeated("<a/>", 100) + "</r>",
         "attribute defaults too large at line 1"},
        {"<r>\n" + repeated("<gen>40000000x 00 </gen>\n", 3) + "</r>", "binary data too large at line 3"},
    };
    for (const auto& c : cases) EXPECT_EQ(parseFailure(c.document), c.failure) << c.document.substr(0, 60);
    EXPECT_EQ(failureOf([] { XmlParser().parseFile("/nowhere/a.xml"); }), "Can not open file /nowhere/a.xml");
}

TEST(XmlParser, largeAndDeepDocumentsWithinTheLimits) {
    const std::string name(1 << 20, 'n');
    XmlParser parser;
    EXPECT_EQ(parseFailure("<" + name + " a='" + name + "'/>", &parser), "no failure");
    EXPECT_EQ(parser.topLevel()->getAttr("a").size(), 1 << 20);

    const std::size_t depth = XmlParser::maxDepth;
    EXPECT_EQ(parseFailure(repeated("<a>", depth) + repeated("</a>", depth), &parser), "no failure");
    const TempFolder folder;
    EXPECT_EQ(XmlParser::storeXmlTree(folder.file("deep.xml").c_str(), parser.topLevel(), nullptr), 0);
    EXPECT_EQ(parser.parseFile(folder.file("deep.xml").c_str()), 0);
}

TEST(XmlParser, storesWhatItCanReadAgain) {
    const TempFolder folder;
    const std::string file = folder.file("a.xml");
    XmlNode root("r");
    root.setAttr("v", "<&>\"'");
    EXPECT_EQ(XmlParser::storeXmlTree(file.c_str(), &root, "r"), 0);
    const std::string bytes = TempFolder::read(file);
    EXPECT_EQ(
        bytes,
        "<?xml version=\"1.0\" encoding=\"UTF-8\" ?>\n<!DOCTYPE r>\n<r v=\"&lt;&amp;&gt;&quot;&apos;\"/>\n");
    XmlParser parser;
    parser.parseFile(Any(file.c_str()).toWString());
    EXPECT_EQ(parser.topLevel()->getAttr("v"), root.getAttr("v"));

    const auto storeFailure = [](XmlNode& node, const std::string& to) {
        return failureOf([&] { XmlParser::storeXmlTree(to.c_str(), &node, nullptr); });
    };
    for (const char* bad : {"", "a b", "1a", "a>", "-", "#x", "\xC3\x97", "\xFF"}) {
        new XmlNode(bad, nullptr, &root);
        EXPECT_EQ(storeFailure(root, file), "Can not store '" + file + "': invalid name '" + bad + "'");
        root.deleteChildren();
    }
    new XmlNode("\xC3\xA4", nullptr, &root);
    EXPECT_EQ(storeFailure(root, folder.file("name.xml")), "no failure");
    root.setAttr("a b", "x");
    EXPECT_EQ(storeFailure(root, file), "Can not store '" + file + "': invalid attribute 'a b'");
    EXPECT_EQ(TempFolder::read(file), bytes);
    XmlNode deep("a"), plain("plain");
    XmlNode* innermost = &deep;
    for (int i = 0; i < 2000; ++i) innermost = new XmlNode("a", nullptr, innermost);
    EXPECT_EQ(storeFailure(deep, file), "Can not store '" + file + "': elements nested too deep");
    EXPECT_EQ(storeFailure(plain, "/nowhere/a.xml"), "Can not open '/nowhere/a.xml' for writing");
    EXPECT_EQ(storeFailure(plain, "/dev/full"), "Can not write '/dev/full'");
}

TEST(XmlParser, standardStreamsStayOpen) {
    XmlNode root("shown");
    testing::internal::CaptureStdout();
    EXPECT_EQ(XmlParser::storeXmlTree("stdout", &root, nullptr), 0);
    EXPECT_EQ(XmlParser::storeXmlTree("stdout", &root, nullptr), 0);
    const std::string once = "<?xml version=\"1.0\" encoding=\"UTF-8\" ?>\n<shown/>\n";
    EXPECT_EQ(testing::internal::GetCapturedStdout(), once + once);
}

// What `run` takes at its peak, in bytes, measured in a process of its own; -1 if the system does not tell.
template <class Run>
long long peakOf(Run run) {
    int ends[2];
    if (pipe(ends) != 0) return -1;
    inChild([&] {
        const auto status = [](const std::string& field) {
            std::ifstream file("/proc/self/status");
            for (std::string line; std::getline(file, line);)
                if (line.starts_with(field)) return 1024 * std::atoll(line.c_str() + field.size());
            return -1LL;
        };
        // The peak of the past is forgotten.
        const bool forgets = static_cast<bool>(std::ofstream("/proc/self/clear_refs") << "5" << std::flush);
        const long long before = status("VmRSS:");
        run();
        const long long bytes = forgets ? status("VmHWM:") - before : -1;
        return write(ends[1], &bytes, sizeof bytes) == sizeof bytes ? 0 : 1;
    });
    long long bytes = -1;
    close(ends[1]);
    if (read(ends[0], &bytes, sizeof bytes) != sizeof bytes) bytes = -1;
    close(ends[0]);
    return bytes;
}

// The documents that take most: many small elements, attributes, dictionaries.
TEST(XmlParser, memoryStaysInProportionToTheDocument) {
#if QV_SANITIZED
    GTEST_SKIP() << "a sanitizer takes memory of its own";
#endif
    const TempFolder folder;
    constexpr std::size_t megabyte = std::size_t{1} << 20;
    for (const char* body : {"<a/>", "<a b=''/>", "<a b='' c='' d='' e=''/>", "<key/><i32/>",
                             "<key>a</key><x/>    ", "<key>k</key><vec/>", "<str/>", "x<a/>"})
        for (const std::size_t size : {megabyte / 8, megabyte}) {
            std::string text = "<d><key>v</key><vec>";
            while (text.size() < size) text += body;
            const std::string file = folder.write("a.xml", text + "</vec></d>");
            const auto most = static_cast<long long>(60 * std::max(text.size(), megabyte));
            EXPECT_LT(peakOf([&] { XmlParser().parseFile(file.c_str()); }), most) << body << size;
            EXPECT_LT(peakOf([&] {
                          AnyDict dict;
                          Any name, version;
                          XmlParser::restoreDict(file.c_str(), dict, name, version);
                      }),
                      most)
                << body << size;
        }
}

// Want of memory may be the reason why a tree goes.
TEST(XmlNode, treesOfAnyShapeGoWithoutALoss) {
    XmlNode root("root");
    XmlNode* deep = &root;
    for (int i = 0; i < 100'000; ++i) {
        for (int k = 0; k < i % 4; ++k) new XmlNode("leaf", nullptr, deep);
        XmlNode* const next = new XmlNode("inner", nullptr, deep);
        for (int k = 0; k < i % 3; ++k) new XmlNode("a", nullptr, new XmlNode("late", nullptr, deep));
        deep = next;
    }
    root.deleteChildren();
    EXPECT_EQ(root.nrChildren(), 0);
}

}  // namespace
