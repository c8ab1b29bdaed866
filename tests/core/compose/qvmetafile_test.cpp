// Metafiles: each form of document, what is read of damaged ones, and the way back.
#include "core/compose/qvmetafile.h"

#include "core/document/xmltrans.h"
#include "core/engine/modules/qvcodec.h"
#include "tests/support/checks.h"

namespace {

class Metafile : public testing::Test {
  protected:
    std::string write(const std::string& body, const std::string& root = "Metafile") const {
        return folder.write("x.mmf", "<?xml version=\"1.0\"?>\n<" + root + ">" + body + "</" + root + ">");
    }
    std::string inFolder(const std::string& name) const { return folder.file(name); }

    TempFolder folder;
};

TEST_F(Metafile, AnAudioInterleaveIsReadAsASetup) {
    const QvMetafile file(narrow(write(
        R"(<AudioInterleave><channels><ch pos="L"><src file="a.wav" channel="1"/>)"
        R"(<src file="/abs/b.wav" stream="2" channel="0" gain="0.25"/></ch><ch/></channels>)"
        R"(<decoders><dec file="a.wav" decoder="wavdec"/><dec file="b.wav"/></decoders>)"
        R"(<filters><any file="a.wav" streamNr="3"><filters name="x"><key>gain</key><i32>7</i32></filters></any>)"
        R"(<stream file="a.wav"/></filters></AudioInterleave>)")));
    ASSERT_EQ(file.errorCode(), 0) << file.errorDesc();
    ASSERT_EQ(file.nrElements(), 1);
    EXPECT_STREQ(file.elementName(0), "AudioInterleave");
    const Any a(inFolder("a.wav").c_str());
    AnyDict left("src", a, "stream", 0, "channel", 1, "weight", 1.0);
    AnyDict right("src", "/abs/b.wav", "stream", 2, "channel", 0, "weight", 0.25);
    AnyDict setup("__class__", "Interleave", "name", "AudioMixSetup", "outChannels",
                  AnyVector(AnyDict("pos", "L", "source", AnyVector(left, right)),
                            AnyDict("pos", Any(), "source", AnyVector())));
    setup.set("decoders", AnyVector(Any(AnyDict("file", a, "dec", "wavdec"))));
    setup.set("filters",
              AnyVector(Any(AnyDict("file", a, "stream", 3, "filters", AnyDict("name", "x", "gain", 7)))));
    EXPECT_TRUE(file.element("AudioInterleave").asDict() == setup);

    // Names are absolute once they were read and written.
    QvMetafile copy = file;
    ASSERT_EQ(copy.save(narrow(inFolder("y.mmf"))), 0);
    const QvMetafile again(narrow(inFolder("y.mmf")));
    EXPECT_TRUE(again.element(0) == file.element(0));
    const std::string text = TempFolder::read(inFolder("y.mmf"));
    EXPECT_NE(text.find("gain=\"0.250\""), std::string::npos) << text;
    EXPECT_NE(text.find("streamNr=\"3\""), std::string::npos) << text;
}

TEST_F(Metafile, AMonoInterleaveKeepsItsNames) {
    const QvMetafile file(narrow(write(
        R"(<MonoInterleave><channels><ch src="l.wav" pos="L"/><ch src="r.wav"/></channels></MonoInterleave>)"
        R"(<MonoInterLeave><channels><ch src="l.wav"/></channels></MonoInterLeave>)")));
    const AnyVector& channels = file.element("MonoInterleave").asDict().getVector("channels");
    ASSERT_EQ(channels.size(), 2);
    EXPECT_TRUE(channels.at(0).asDict() == AnyDict("src", "l.wav", "pos", "L"));
    EXPECT_TRUE(channels.at(1).asDict().get("src") == "r.wav");
    // The other spelling is an unknown element there.
    EXPECT_FALSE(file.element("MonoInterLeave").isValid());
    EXPECT_TRUE(file.contains("MonoInterLeave"));
    EXPECT_FALSE(file.contains("x"));
    EXPECT_TRUE(file.element("x").isNull());
    EXPECT_EQ(file.elementName(2), nullptr);
}

TEST_F(Metafile, WhatIsNoMetafileIsRefused) {
    const struct {
        std::string name, description;
        int code;
    } rows[] = {
        {inFolder("none.mmf"), "Can not open file", -15},
        {folder.write("open.mmf", "<Metafile><a>"), "Error in xml file", -15},
        {folder.write("other.mmf", "<BatchList/>"), "Invalid metafile syntax - missing <Metafile> tag.", -15},
        {folder.write("empty.mmf", ""), "Error in xml file", -15},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.name);
        QvMetafile file;
        file.addElement("left", Any(1));
        EXPECT_EQ(file.open(narrow(row.name)), row.code);
        EXPECT_EQ(file.errorCode(), row.code);
        EXPECT_EQ(std::string(file.errorDesc()).rfind(row.description, 0), 0u) << file.errorDesc();
        EXPECT_EQ(file.nrElements(), 0);
        EXPECT_NE(QvMetafile::check(narrow(row.name)), "");
    }
    // Only the first eight characters of the root's name are compared.
    EXPECT_EQ(QvMetafile(narrow(write("<MonoInterleave/>", "Metafile2"))).nrElements(), 1);
}

// What is passed over is logged; what can't be is an assertion, which check() foresees.
TEST_F(Metafile, DamagedElements) {
    const struct {
        const char* body;
        const char* logged;  // at level 4; null for an assertion
    } rows[] = {
        {"<MonoInterleave/>", "MonoInterleave: invalid definition -> 'channels' not found"},
        {"<MonoInterleave><x/></MonoInterleave>", "MonoInterleave: unknown tag x"},
        {"<MonoInterleave><channels><x/></channels></MonoInterleave>",
         "MonoInterleave: invalid tag x in channel definition"},
        {"<MonoInterleave><channels/></MonoInterleave>", "MonoInterleave: no channel definitions found"},
        {"<MonoInterleave><channels/><channels/></MonoInterleave>", nullptr},
        {"<MonoInterleave><channels><ch pos='L'/></channels></MonoInterleave>", nullptr},
        {"<AudioInterleave/>", ""},
        {"<AudioInterleave><channels/></AudioInterleave>", ""},
        {"<AudioInterleave><channels><x/></channels></AudioInterleave>", "Interleave: unknown tag x"},
        {"<AudioInterleave><channels><ch><x/></ch></channels></AudioInterleave>",
         "Interleave: unknown tag x"},
        {"<AudioInterleave><channels/><decoders><dec file='a'/></decoders></AudioInterleave>",
         "Interleave: invalid dec node"},
        {"<AudioInterleave><channels/><filters><s file='a' streamNr='0'/></filters></AudioInterleave>",
         "Interleave: invalid filters node"},
        {"<AudioInterleave><channels><ch><src file='a'/></ch></channels></AudioInterleave>", nullptr},
        {"<AudioInterleave><channels><ch><src channel='0'/></ch></channels></AudioInterleave>", nullptr},
        {"<AudioInterleave><channels><ch><src file='' channel='0'/></ch></channels></AudioInterleave>",
         nullptr},
        {"<AudioInterleave><channels/><decoders><dec file='' decoder='d'/></decoders></AudioInterleave>",
         nullptr},
        {"<AudioInterleave><channels/><filters><s file='' streamNr='0'><f/></s></filters></AudioInterleave>",
         nullptr},
        {"<Metafile/>", nullptr},
        {"<vec><Metafile><Metafile/></Metafile></vec>", nullptr},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.body);
        const Any name = narrow(write(row.body));
        LogCapture log;
        EXPECT_EQ(QvMetafile::check(name) == "", row.logged != nullptr) << QvMetafile::check(name);
        EXPECT_EQ(log.count("nterleave: "), 0);
        if (row.logged) {
            EXPECT_EQ(QvMetafile(name).errorCode(), 0);
            EXPECT_TRUE(!*row.logged || log.contains(row.logged, QvLogMask::warning));
        } else {
            EXPECT_THROW(QvMetafile{name}, QvAssertFailure);
        }
    }
    EXPECT_EQ(
        QvMetafile(narrow(write("<AudioInterleave/>"))).element(0).asDict().getVector("outChannels").size(),
        0);
}

struct Shouting : XmlTrans {
    void XmlToAny(const XmlNode* from, Any& to) override { to = from->getAttr("text"); }
    void AnyToXml(const Any& from, XmlNode* to) override { to->setAttr("text", from); }
};

TEST_F(Metafile, FurtherTagsHaveTranslators) {
    Shouting handler;
    QvMetafile file;
    file.addElement("Shout", Any("hey"));
    file.addElement("Plain", Any(5));
    QvMetafile::registerHandler("Shout", &handler);
    EXPECT_EQ(QvMetafile::getHandler("Shout"), &handler);
    EXPECT_EQ(file.save(narrow(inFolder("x.mmf"))), 0);
    const QvMetafile back(narrow(inFolder("x.mmf")));
    QvMetafile::unregisterHandler("Shout");
    EXPECT_EQ(QvMetafile::getHandler("Shout"), nullptr);
    EXPECT_TRUE(back.element("Shout") == "hey");
    EXPECT_TRUE(back.element("i32") == Any(5));  // a plain value is named after its type
    EXPECT_THROW(file.save(narrow(inFolder("no/such/x.mmf"))), QvFileException);

    QvMetafile one, other;
    one = other;
    other.addElement("late", Any(1));
    EXPECT_TRUE(one.contains("late"));
}

struct Meta : QvCodec {
    Any isMeta, metaData;
    int setParam(const char*, const Any&) override { return 0; }
    void getParam(const char* name, Any& value) const override {
        if (std::strcmp(name, "isMeta") == 0) value = isMeta;
        if (std::strcmp(name, "metaData") == 0) value = metaData;
    }
    int open() override { return 0; }
    int close() override { return 0; }
    void* getInterface(int) const override { return nullptr; }
};

TEST_F(Metafile, ADecoderOfInputsIsSaved) {
    Meta decoder;
    const Any path = narrow(inFolder("x.mmf"));
    const AnyVector pairs("vec", AnyVector(Any(1)));
    const struct {
        Any isMeta, data;
        int result;  // 1: an assertion
    } rows[] = {
        {Any(0), pairs, -1},
        {Any(), pairs, -1},
        {Any(1), Any(), -1},
        {Any(1), AnyVector(), -1},
        {Any(1), AnyVector(Any(1)), 1},
        {Any(1), AnyVector(1, 2), 1},
        {Any(1), AnyVector("a", Any()), 1},
        {Any(1), pairs, 0},
    };
    for (const auto& row : rows) {
        decoder.isMeta = row.isMeta;
        decoder.metaData = row.data;
        QvMetafile file;
        if (row.result == 1) {
            EXPECT_THROW(file.saveDecoder(&decoder, path), QvAssertFailure);
            continue;
        }
        EXPECT_EQ(file.saveDecoder(&decoder, path), row.result);
        EXPECT_EQ(std::filesystem::exists(inFolder("x.mmf")), row.result == 0);
        EXPECT_STREQ(file.errorDesc(),
                     row.result ? "Decoder unnamed doesn't provide valid 'metaData' parameter" : "");
    }
    QvMetafile file;
    EXPECT_THROW(file.saveDecoder(nullptr, path), QvAssertFailure);
    EXPECT_THROW(file.saveDecoder(&decoder, Any("")), QvAssertFailure);
    EXPECT_THROW(file.saveDecoder(&decoder, Any(1)), QvAssertFailure);
}

}  // namespace
