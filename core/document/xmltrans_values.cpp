// The types that are data of an element or a few of its attributes.
#include <memory>
#include <string_view>

#include "core/document/xmltext_p.h"
#include "core/document/xmltrans.h"
#include "core/engine/log/qvlog.h"
#include "core/measure/qvgeometry.h"
#include "core/value/anytext_p.h"
#include "core/value/numbertext_p.h"
#include "core/value/utf.h"

namespace {

std::string_view dataOf(const XmlNode* node) {
    return {node->data(), static_cast<std::size_t>(node->dataSize())};
}

void setNumber(XmlNode* node, const char* attribute, long long value) {
    node->setAttr(attribute, Any::sprintf("%lld", value));
}

// The number of an attribute; false, with `value` as it was, if the attribute is no String.
bool getNumber(const XmlNode* node, const char* attribute, int& value) {
    const Any& text = node->getAttr(attribute);
    if (!text.isString()) return false;
    value = qvParseInt32(qvNarrowView(text));
    return true;
}
bool getNumber(const XmlNode* node, const char* attribute, long long& value) {
    const Any& text = node->getAttr(attribute);
    if (!text.isString()) return false;
    value = qvParseInt64(qvNarrowView(text));
    return true;
}

// The words for the first kinds of a bit rate, by number.
constexpr const char* bitrateWords[] = {"cbr", "vbr", "cqt", "cqt_strict"};
constexpr int bitrateWordCount = static_cast<int>(std::size(bitrateWords));

}  // namespace

void XmlTrans::fromInvalid(const Any&, XmlNode* to) { to->setName("inv"); }

void XmlTrans::fromInt32(const Any& from, XmlNode* to) {
    to->setName("i32");
    to->sprintf("%d", from.asInt32());
}

void XmlTrans::fromInt64(const Any& from, XmlNode* to) {
    to->setName("i64");
    to->sprintf("%lld", from.asInt64());
}

void XmlTrans::fromFloat(const Any& from, XmlNode* to) {
    to->setName("fl");
    to->sprintf("%f", from.asFloat());
}

void XmlTrans::fromString(const Any& from, XmlNode* to) {
    to->setName("str");
    const std::string_view text = qvNarrowView(from);
    to->addRawData(text.data(), qvTextLength(text.size()));
}

void XmlTrans::fromWString(const Any& from, XmlNode* to) {
    to->setName("wstr");
    const std::string text = QvUtf::toUtf8(qvWideView(from));
    to->addRawData(text.data(), qvTextLength(text.size()));
}

void XmlTrans::fromVector(const Any& from, XmlNode* to) {
    to->setName("vec");
    for (const Any& item : from.asVector()) {
        auto node = std::make_unique<XmlNode>(nullptr);
        AnyToXml(item, node.get());
        to->addChild(node.get());
        node.release();
    }
}

void XmlTrans::fromFramerate(const Any& from, XmlNode* to) {
    const QvFramerate& rate = from.asFramerate();
    to->setName("framerate");
    setNumber(to, "num", rate.rate().num);
    setNumber(to, "denom", rate.rate().den);
    setNumber(to, "df", rate.df() ? 1 : 0);
    setNumber(to, "interlaced", rate.interlaced());
    setNumber(to, "pulldown", rate.pulldown());
}

void XmlTrans::fromPoint(const Any& from, XmlNode* to) {
    to->setName("pt");
    setNumber(to, "x", from.asPoint().x());
    setNumber(to, "y", from.asPoint().y());
}

void XmlTrans::fromRect(const Any& from, XmlNode* to) {
    const QvRect& rect = from.asRect();
    to->setName("rect");
    setNumber(to, "top", rect.top());
    setNumber(to, "bottom", rect.bottom());
    setNumber(to, "left", rect.left());
    setNumber(to, "right", rect.right());
}

void XmlTrans::fromBitrate(const Any& from, XmlNode* to) {
    const QvBitrate& rate = from.asBitrate();
    to->setName("bitrate");
    if (rate.type >= 0 && rate.type < bitrateWordCount)
        to->setAttr("type", bitrateWords[rate.type]);
    else
        setNumber(to, "type", rate.type);
    if (rate.target) setNumber(to, "target", rate.target);
    if (rate.min) setNumber(to, "min", rate.min);
    if (rate.max) setNumber(to, "max", rate.max);
    if (rate.mode) setNumber(to, "mode", rate.mode);
}

void XmlTrans::fromPair(const Any& from, XmlNode* to) {
    to->setName("pair");
    setNumber(to, "first", from.asPair().first);
    setNumber(to, "second", from.asPair().second);
}

void XmlTrans::fromMediaTime(const Any& from, XmlNode* to) {
    to->setName("mediatime");
    setNumber(to, "ticks", from.asMediaTime().value());
    setNumber(to, "scale", from.asMediaTime().timescale());
}

void XmlTrans::parseInt32(const XmlNode* from, Any& to) { to = qvParseInt32(dataOf(from)); }
void XmlTrans::parseInt64(const XmlNode* from, Any& to) { to = qvParseInt64(dataOf(from)); }
void XmlTrans::parseFloat(const XmlNode* from, Any& to) { to = qvParseFloat(dataOf(from)); }

void XmlTrans::parseString(const XmlNode* from, Any& to) {
    if (qvIsAscii(dataOf(from)))
        to = qvTextOf(dataOf(from));
    else
        to = from->rawData().toString();
}

void XmlTrans::parseWString(const XmlNode* from, Any& to) { to = from->rawData().toWString(); }

void XmlTrans::parseVector(const XmlNode* from, Any& to) {
    to = AnyVector();
    for (int i = 0; i < from->nrChildren(); ++i) XmlToAny(from->child(i), to.asVector().append(Any()));
}

void XmlTrans::parseFramerate(const XmlNode* from, Any& to) {
    struct Field {
        const char* attribute;
        int value;
        const char* missing;
    };
    Field fields[] = {
        {"num", 25, "[xmlnode] Invalid framerate node, missing'num'"},
        {"denom", 1, "[xmlnode] Invalid framerate node, missing 'denom'"},
        {"df", 0, "[xmlnode] Invalid framerate node, missing 'df'"},
        {"interlaced", 0, "[xmlnode] Invalid framerate node, missing 'interlaced'"},
        {"pulldown", 0, "[xmlnode] Invalid framerate node, missing 'pulldown'"},
    };
    for (Field& field : fields)
        if (!getNumber(from, field.attribute, field.value)) qv_dbg()->write("%s", field.missing);
    const auto& [num, denom, df, interlaced, pulldown] = fields;
    QvFramerate rate;
    rate.setAll(QvRatio(num.value, denom.value), interlaced.value, df.value != 0, pulldown.value);
    to = rate;
}

void XmlTrans::parsePoint(const XmlNode* from, Any& to) {
    to.invalidate();
    int x = 0, y = 0;
    if (getNumber(from, "x", x) && getNumber(from, "y", y)) to = QvPoint(x, y);
}

void XmlTrans::parseRect(const XmlNode* from, Any& to) {
    to.invalidate();
    int top = 0, bottom = 0, left = 0, right = 0;
    if (getNumber(from, "top", top) && getNumber(from, "bottom", bottom) && getNumber(from, "left", left) &&
        getNumber(from, "right", right))
        to = QvRect(left, top, right, bottom);
}

void XmlTrans::parseBitrate(const XmlNode* from, Any& to) {
    to.invalidate();
    const Any& type = from->getAttr("type");
    if (!type.isString()) return;
    QvBitrate rate;
    while (rate.type < bitrateWordCount && type != bitrateWords[rate.type]) ++rate.type;
    if (rate.type == bitrateWordCount) {
        getNumber(from, "type", rate.type);
        rate.target = rate.type;
    }
    getNumber(from, "target", rate.target);
    getNumber(from, "mode", rate.mode);
    getNumber(from, "min", rate.min);
    getNumber(from, "max", rate.max);
    to = rate;
}

void XmlTrans::parsePair(const XmlNode* from, Any& to) {
    Pair pair;
    getNumber(from, "first", pair.first);
    getNumber(from, "second", pair.second);
    to = pair;
}

void XmlTrans::parseMediaTime(const XmlNode* from, Any& to) {
    to.invalidate();
    long long ticks = 0, scale = 0;
    getNumber(from, "ticks", ticks);
    if (getNumber(from, "scale", scale) && scale >= 1) to = MediaTime(ticks, scale);
}
