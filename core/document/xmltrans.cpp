#include "core/document/xmltrans.h"

#include <memory>
#include <string_view>

#include "core/arch/qvassert.h"
#include "core/document/xmltext_p.h"
#include "core/document/xmltrans_p.h"
#include "core/value/anytext_p.h"

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
