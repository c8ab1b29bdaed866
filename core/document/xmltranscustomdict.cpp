#include <memory>

#include "core/arch/qvassert.h"
#include "core/document/xmltrans.h"
#include "core/document/xmltrans_p.h"

void XmlTransCustomDict::AnyToXml(const Any& from, XmlNode* to) {
    if (from.isDict())
        DictToXml(from.asDict(), to);
    else
        XmlTrans::AnyToXml(from, to);
}

void XmlTransCustomDict::DictToXml(const AnyDict& from, XmlNode* to) {
    for (const auto [key, value] : from) {
        if (std::strcmp(key, "__class__") == 0 && value->isText()) {
            to->setName(value->toString().asString());
        } else if (std::strcmp(key, "__version__") == 0 && qvXmlVersionText(*value).isText()) {
            to->setAttr("version", qvXmlVersionText(*value));
        } else if (std::strcmp(key, "name") == 0 && value->isText()) {
            to->setAttr("name", *value);
        } else {
            auto node = std::make_unique<XmlNode>(nullptr);
            XmlTrans::AnyToXml(*value, node.get());
            node->setAttr("type", qvXmlElementOf(value->type()));
            node->setName(key);
            to->addChild(node.get());
            node.release();
        }
    }
    if (!to->name()) to->setName("dict");
}

void XmlTransCustomDict::XmlToDict(const XmlNode* from, AnyDict& to) {
    QV_ASSERT_MSG(from->name(), "from->name()");
    if (std::strcmp(from->name(), "dict") != 0) to.set("__class__", from->name());
    const bool plain =
        from->nrChildren() > 0 && from->child(0)->name() && std::strcmp(from->child(0)->name(), "key") == 0;
    if (plain) return XmlTrans::XmlToDict(from, to);
    if (const Any& value = from->getAttr("version"); value.isText()) to.set("__version__", value.toString());
    if (const Any& value = from->getAttr("name"); value.isText()) to.set("name", value.toString());
    for (int i = 0; i < from->nrChildren(); ++i) {
        const XmlNode* const child = from->child(i);
        if (!child->name()) continue;
        const Any type = child->getAttr("type").toString();
        QV_ASSERT(type.isTrue());
        parseItem(child, to.set(child->name(), Any()), type.asString());
    }
}

void XmlTransCustomDict::parseItem(const XmlNode* from, Any& to, const char* type) {
    if (const auto known = qvXmlTypeOf(type)) parseTyped(*known, from, to);
}
