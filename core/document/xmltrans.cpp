#include "core/document/xmltrans.h"

#include <memory>
#include <string_view>

#include "core/arch/qvassert.h"
#include "core/document/generictext_p.h"
#include "core/document/xmltext_p.h"
#include "core/document/xmltrans_p.h"
#include "core/engine/log/qvlog.h"
#include "core/measure/qvgeometry.h"
#include "core/value/anytext_p.h"
#include "core/value/numbertext_p.h"
#include "core/value/utf.h"

namespace {

bool isNamed(const XmlNode& node, const char* name) {
    return node.name() && std::strcmp(node.name(), name) == 0;
}

XmlNode* addNamed(XmlNode* to, const char* name, std::string_view data) {
    auto node = std::make_unique<XmlNode>(name);
    node->addRawData(data.data(), qvTextLength(data.size()));
    to->addChild(node.get());
    return node.release();
}

// A class that can be the name of a dictionary's element and will be read as one.
bool namesElement(const char* className) {
    for (const char* const taken : {"key", "ent", "val"})
        if (std::strcmp(className, taken) == 0) return false;
    return !qvXmlTypeOf(className) && qvIsXmlName(className);
}

void storeClass(const Any& className, XmlNode* to) {
    const Any text = className.toString();
    if (!to->name() && namesElement(text.asString()))
        to->setName(text.asString());
    else if (!to->name() || text != to->name())
        to->setAttr("class", className);
}

// The value of an entry that an old document wraps in `ent`: its second child, or what `val` holds there.
const XmlNode* wrappedValue(const XmlNode& entry) {
    if (entry.nrChildren() < 2) return nullptr;
    const XmlNode* const value = entry.child(1);
    if (!isNamed(*value, "val")) return value;
    return value->nrChildren() > 0 ? value->child(0) : nullptr;
}

// --- Attributes and data

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

Any qvXmlVersionText(const Any& version) {
    if (version.isInt()) return Any::sprintf("%lld", version.toInt64());
    if (version.isFloat()) return Any::sprintf("%f", version.asFloat());
    return version.isText() ? version : Any();
}

const char* qvXmlDataText(const XmlNode& node, Any& scratch) {
    if (qvIsAscii({node.data(), static_cast<std::size_t>(node.dataSize())})) return node.data();
    scratch = node.rawData().toString();
    return scratch.asString();
}

void XmlTrans::AnyToXml(const Any& from, XmlNode* to) {
    switch (from.type()) {
        case Any::Int32: fromInt32(from, to); break;
        case Any::Int64: fromInt64(from, to); break;
        case Any::Float: fromFloat(from, to); break;
        case Any::String: fromString(from, to); break;
        case Any::WString: fromWString(from, to); break;
        case Any::Dict: DictToXml(from.asDict(), to); break;
        case Any::Vector: fromVector(from, to); break;
        case Any::Generic: fromGeneric(from, to); break;
        case Any::Framerate: fromFramerate(from, to); break;
        case Any::Point: fromPoint(from, to); break;
        case Any::Rect: fromRect(from, to); break;
        case Any::Bitrate: fromBitrate(from, to); break;
        case Any::Pair: fromPair(from, to); break;
        case Any::MediaTime: fromMediaTime(from, to); break;
        default: fromInvalid(from, to); break;
    }
    QV_ASSERT_MSG(to->name(), "node->name()");
}

bool XmlTrans::parseTyped(int type, const XmlNode* from, Any& to) {
    switch (type) {
        case Any::Int32: parseInt32(from, to); return true;
        case Any::Int64: parseInt64(from, to); return true;
        case Any::Float: parseFloat(from, to); return true;
        case Any::String: parseString(from, to); return true;
        case Any::WString: parseWString(from, to); return true;
        case Any::Generic: parseGeneric(from, to); return true;
        case Any::Dict:
            to = AnyDict();
            XmlToDict(from, to.asDict());
            return true;
        case Any::Vector: parseVector(from, to); return true;
        case Any::Framerate: parseFramerate(from, to); return true;
        case Any::Point: parsePoint(from, to); return true;
        case Any::Rect: parseRect(from, to); return true;
        case Any::Bitrate: parseBitrate(from, to); return true;
        case Any::Pair: parsePair(from, to); return true;
        case Any::MediaTime: parseMediaTime(from, to); return true;
        default: return false;
    }
}

void XmlTrans::XmlToAny(const XmlNode* from, Any& to) {
    const auto type = qvXmlTypeOf(from->name());
    if (!type) return parseObject(from, to);
    if (!parseTyped(*type, from, to)) to.invalidate();
}

void XmlTrans::DictToXml(const AnyDict& from, XmlNode* to) {
    for (const auto [key, value] : from) {
        const std::string_view name(key);
        if (name.starts_with('#')) continue;
        if (name == "__class__" && value->isText()) {
            storeClass(*value, to);
        } else if (name == "__version__" && qvXmlVersionText(*value).isText()) {
            to->setAttr("version", qvXmlVersionText(*value));
        } else if (name == "name" && value->isText()) {
            to->setAttr("name", *value);
        } else {
            addNamed(to, "key", name);
            auto node = std::make_unique<XmlNode>(nullptr);
            AnyToXml(*value, node.get());
            to->addChild(node.get());
            node.release();
        }
    }
    if (!to->name()) to->setName("dict");
}

void XmlTrans::XmlToDict(const XmlNode* from, AnyDict& to) {
    if (const Any& value = from->getAttr("class"); value.isText()) to.set("__class__", value.toString());
    if (const Any& value = from->getAttr("version"); value.isText()) to.set("__version__", value.toString());
    if (const Any& value = from->getAttr("name"); value.isText()) to.set("name", value.toString());
    if (from->nrChildren() == 0) return;

    const auto restore = [&](const XmlNode& key, const XmlNode* value) {
        Any scratch;
        XmlToAny(value, to.set(qvXmlDataText(key, scratch), Any()));
    };
    const bool wrapped = isNamed(*from->child(0), "ent");
    for (int i = 0; i < from->nrChildren(); ++i) {
        const XmlNode& child = *from->child(i);
        if (wrapped) {
            if (const XmlNode* const value = wrappedValue(child)) restore(*child.child(0), value);
        } else if (isNamed(child, "key") && i + 1 < from->nrChildren()) {
            restore(child, from->child(++i));
        }
    }
}

void XmlTrans::parseObject(const XmlNode* from, Any& to) {
    const bool empty = from->nrChildren() == 0;
    if (!from->name() || (!empty && !isNamed(*from->child(0), "key"))) return to.invalidate();
    to = AnyDict("__class__", from->name());
    if (!empty) XmlToDict(from, to.asDict());
}

// --- The steps for each type

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

void XmlTrans::fromGeneric(const Any& from, XmlNode* to) {
    to->setName("gen");
    const std::string text =
        qvGenericText({static_cast<const char*>(from.asGeneric()), static_cast<std::size_t>(from.size())});
    to->addRawData(text.data(), static_cast<int>(text.size()));
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

void XmlTrans::parseGeneric(const XmlNode* from, Any& to) {
    const long long length = qvGenericLength(dataOf(from));
    if (length > XmlParser::maxExpanded) return to.invalidate();
    const std::vector<char> bytes = qvGenericBytes(dataOf(from), length);
    to.set(static_cast<const void*>(bytes.data()), static_cast<int>(length));
}

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
