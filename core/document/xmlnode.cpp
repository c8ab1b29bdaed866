#include <cstdarg>
#include <cstring>
#include <vector>

#include "core/arch/cformat.h"
#include "core/arch/qvassert.h"
#include "core/document/blockmemory_p.h"
#include "core/document/xmldom.h"
#include "core/document/xmltext_p.h"
#include "core/document/xmlwriter_p.h"
#include "core/value/anytext_p.h"
#include "core/value/utf.h"

Any qvXmlText(std::string_view text) {
    return qvIsAscii(text) ? qvTextOf(text) : qvTextOf(QvWideView(QvUtf::toUtf16(text)));
}

void* XmlNode::operator new(std::size_t size) { return QvBlockMemory::take(size); }
void XmlNode::operator delete(void* node) { QvBlockMemory::giveBack(node); }

XmlNode::XmlNode(const char* name, const char** attrs, XmlNode* parent, const char* data) {
    setName(name);
    for (; attrs && attrs[0] && attrs[1]; attrs += 2) attributes_.set(attrs[0], qvXmlText(attrs[1]));
    if (data) addRawData(data);
    if (parent) parent->addChild(this);
}

XmlNode::~XmlNode() { deleteChildren(); }

void XmlNode::setName(const char* name) {
    named_ = name != nullptr;
    if (name)
        name_ = name;
    else
        name_.clear();
}

void XmlNode::stripXMLNamespace(bool recursive) {
    std::vector<XmlNode*> pending{this};
    while (!pending.empty()) {
        XmlNode* const node = pending.back();
        pending.pop_back();
        const char* const colon = node->name() ? std::strchr(node->name(), ':') : nullptr;
        if (colon && !std::strchr(colon + 1, ':')) node->setName(colon + 1);
        if (recursive) pending.insert(pending.end(), node->children_.begin(), node->children_.end());
    }
}

Any XmlNode::rawData() const { return qvXmlText(data_); }

void XmlNode::addRawData(const char* text, int size) {
    QV_ASSERT(text && size >= -1);
    const std::size_t count = size < 0 ? std::strlen(text) : static_cast<std::size_t>(size);
    const long long total = std::ssize(data_) + static_cast<long long>(count);
    if (total >= capacity_ - 1) {
        const long long grown = static_cast<long long>(count) + 2LL * capacity_;
        QV_ASSERT(grown <= 0x7FFFFFFF);
        capacity_ = static_cast<int>(grown);
    }
    data_.append(text, count);
}

void XmlNode::sprintf(const char* format, ...) {
    std::string text(static_cast<std::size_t>(capacity_ - 1), 0);
    va_list args;
    va_start(args, format);
    const int length = qv_vformat(text.data(), text.size() + 1, format, args);
    va_end(args);
    data_.assign(text.c_str(), length < 0 ? 0 : std::strlen(text.c_str()));
}

XmlNode* XmlNode::child(const char* name) const {
    for (XmlNode* const node : children_)
        if (node->named_ && name && node->name_ == name) return node;
    return nullptr;
}

void XmlNode::addChild(XmlNode* child) {
    QV_ASSERT(child && child != this);
    children_.append(child);
}

void XmlNode::deleteChildren() {
    while (!children_.empty()) deleteTree(children_.remove(children_.size() - 1));
}

// However deep the tree is, and without memory, which may be the reason why it goes: on the way down the
// place of a node's first child holds the node above it.
void XmlNode::deleteTree(XmlNode* node) {
    for (XmlNode* above = nullptr; node || above;) {
        if (node && !node->children_.empty()) {
            XmlNode* const first = node->children_.at(0);
            node->children_.set(0, above);
            above = node;
            node = first;
            continue;
        }
        delete node;
        node = nullptr;
        if (!above) continue;
        if (above->children_.size() > 1) {
            node = above->children_.remove(above->children_.size() - 1);
            continue;
        }
        XmlNode* const done = above;
        above = done->children_.at(0);
        done->children_.clear();
        delete done;
    }
}

int XmlNode::write(void* stream, int indent) const {
    if (!name()) return -1;
    QV_ASSERT(stream && indent >= 0);
    return qvWriteXml(*this, static_cast<std::FILE*>(stream), indent);
}
