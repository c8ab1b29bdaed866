#include "core/compose/xmltransmetafile_p.h"

#include <cstring>
#include <memory>

#include "core/arch/qvassert.h"
#include "core/compose/qvmetafile.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/value/numbertext_p.h"

namespace {

constexpr const char* rootName = "Metafile";
constexpr const char* audioName = "AudioInterleave";
constexpr const char* monoName = "MonoInterleave";
constexpr const char* monoDictName = "MonoInterLeave";  // of a dictionary's element; so it has always been

bool isNamed(const XmlNode& node, const char* name) {
    return node.name() && std::strcmp(node.name(), name) == 0;
}

const char* nameOf(const XmlNode& node) { return node.name() ? node.name() : ""; }

std::string_view textOf(const Any& attribute, Any& scratch) {
    scratch = attribute.toString();
    return scratch.asString("");
}

int integerOf(const Any& attribute) {
    Any scratch;
    return qvParseInt32(textOf(attribute, scratch));
}

double numberOf(const Any& attribute) {
    Any scratch;
    return qvParseFloat(textOf(attribute, scratch));
}

// 0 for what is no number.
int integerIn(const AnyDict& dict, const char* key) {
    const Any& value = dict.get(key);
    return value.isInt() || value.isFloat() ? value.toInt32() : 0;
}

double numberIn(const AnyDict& dict, const char* key) {
    const Any& value = dict.get(key);
    return value.isInt() || value.isFloat() ? value.toDouble() : 0.0;
}

XmlNode& addNode(XmlNode& parent, const char* name) {
    auto node = std::make_unique<XmlNode>(name);
    parent.addChild(node.get());
    return *node.release();
}

void setText(XmlNode& node, const char* name, const Any& text) {
    if (text.isText()) node.setAttr(name, text.toString());
}

void writeSource(const AnyDict& source, XmlNode& to) {
    XmlNode& node = addNode(to, "src");
    setText(node, "file", source.get("src"));
    node.setAttr("stream", Any::sprintf("%d", source.getInt32("stream")));
    node.setAttr("channel", Any::sprintf("%d", integerIn(source, "channel")));
    node.setAttr("gain", Any::sprintf("%.3f", numberIn(source, "weight")));
}

void writeDecoders(const AnyVector& decoders, XmlNode& to) {
    for (const Any& entry : decoders) {
        if (!entry.isDict()) continue;
        XmlNode& node = addNode(to, "dec");
        setText(node, "file", entry.asDict().get("file"));
        setText(node, "decoder", entry.asDict().get("dec"));
    }
}

}  // namespace

void XmlTransMetafile::warn(const std::string& text) const {
    if (!fault_) qv_dbg()->warning("%s", text.c_str());
}

void XmlTransMetafile::damaged(int line, const char* reason) const {
    if (!fault_) qvAssertFailAt(__FILE__, line, reason);
    if (fault_->empty()) *fault_ = reason;
}

Any XmlTransMetafile::resolved(const Any& name) const {
    if (name.size() == 0) {
        damaged(__LINE__, "an empty file name in AudioInterleave");
        return name;
    }
    return QvFile::isAbsolutePath(name) ? name : QvFile::joinPath(basePath_, name);
}

// --- Reading.

void XmlTransMetafile::XmlToAny(const XmlNode* from, Any& to) {
    if (isNamed(*from, rootName)) {
        to = AnyDict();
        if (!fault_) XmlToDict(from, to.asDict());
        damaged(__LINE__, "a Metafile element inside another");
    } else if (isNamed(*from, monoName)) {
        to = AnyDict();
        readMono(*from, to.asDict());
    } else if (isNamed(*from, audioName)) {
        to = AnyDict();
        readAudio(*from, to.asDict());
    } else if (XmlTrans* handler = QvMetafile::getHandler(from->name())) {
        handler->XmlToAny(from, to);
    } else {
        XmlTrans::XmlToAny(from, to);
    }
}

void XmlTransMetafile::XmlToDict(const XmlNode* from, AnyDict& to) {
    // The root may have more to its name.
    if (std::strncmp(nameOf(*from), rootName, std::strlen(rootName)) == 0)
        readRoot(*from, to);
    else if (isNamed(*from, monoDictName))
        readMono(*from, to);
    else if (isNamed(*from, audioName))
        readAudio(*from, to);
    else if (XmlTrans* handler = QvMetafile::getHandler(from->name()))
        handler->XmlToDict(from, to);
    else
        XmlTrans::XmlToDict(from, to);
}

void XmlTransMetafile::readRoot(const XmlNode& root, AnyDict& to) {
    to.set("__class__", rootName);
    AnyVector& elements = to.set("elements", AnyVector()).asVector();
    AnyVector& names = to.set("names", AnyVector()).asVector();
    for (int i = 0; i < root.nrChildren(); ++i) {
        names.append(Any(nameOf(*root.child(i))));
        XmlToAny(root.child(i), elements.append(Any()));
    }
}

void XmlTransMetafile::readMono(const XmlNode& node, AnyDict& to) {
    const XmlNode* found = nullptr;
    for (int i = 0; i < node.nrChildren(); ++i) {
        const XmlNode* child = node.child(i);
        if (!isNamed(*child, "channels")) {
            warn(std::string("MonoInterleave: unknown tag ") + nameOf(*child));
            continue;
        }
        if (found) return damaged(__LINE__, "more than one 'channels' in MonoInterleave");
        found = child;
    }
    if (!found) return warn("MonoInterleave: invalid definition -> 'channels' not found");

    TPtrList<XmlNode> list;
    for (int i = 0; i < found->nrChildren(); ++i) {
        if (isNamed(*found->child(i), "ch"))
            list.append(found->child(i));
        else
            warn(std::string("MonoInterleave: invalid tag ") + nameOf(*found->child(i)) +
                 " in channel definition");
    }
    if (list.empty()) return warn("MonoInterleave: no channel definitions found");

    to.set("__class__", monoName);
    AnyVector& channels = to.set("channels", AnyVector()).asVector();
    for (const XmlNode* channel : list) {
        if (!channel->getAttr("src").isValid()) {
            warn("MonoInterleave: invalid channel node");
            return damaged(__LINE__, "a channel of MonoInterleave without 'src'");
        }
        channels.append(AnyDict("src", channel->getAttr("src"), "pos", channel->getAttr("pos")));
    }
}

void XmlTransMetafile::readAudio(const XmlNode& node, AnyDict& to) {
    to.set("__class__", "Interleave");
    to.set("name", "AudioMixSetup");
    AnyVector& outputs = to.set("outChannels", AnyVector()).asVector();
    const XmlNode* channels = node.child("channels");
    if (!channels) return;
    for (int i = 0; i < channels->nrChildren(); ++i) {
        const XmlNode& child = *channels->child(i);
        if (isNamed(child, "ch"))
            readAudioChannel(child, outputs.append(Any(AnyDict())).asDict());
        else
            warn(std::string("Interleave: unknown tag ") + nameOf(child));
    }
    if (const XmlNode* decoders = node.child("decoders")) readDecoders(*decoders, to);
    if (const XmlNode* filters = node.child("filters")) readFilters(*filters, to);
}

void XmlTransMetafile::readAudioChannel(const XmlNode& node, AnyDict& to) {
    to.set("pos", node.getAttr("pos"));
    AnyVector& sources = to.set("source", AnyVector()).asVector();
    for (int i = 0; i < node.nrChildren(); ++i) {
        if (isNamed(*node.child(i), "src"))
            readSource(*node.child(i), sources);
        else
            warn(std::string("Interleave: unknown tag ") + nameOf(*node.child(i)));
    }
}

void XmlTransMetafile::readSource(const XmlNode& node, AnyVector& to) {
    const Any &file = node.getAttr("file"), &channel = node.getAttr("channel");
    if (!file.isValid() || !channel.isValid()) {
        warn("Interleave: invalid channel node");
        return damaged(__LINE__, "a source of AudioInterleave without 'file' or 'channel'");
    }
    const Any &stream = node.getAttr("stream"), &gain = node.getAttr("gain");
    to.append(Any(AnyDict("src", resolved(file), "stream", stream.isTrue() ? integerOf(stream) : 0, "channel",
                          integerOf(channel), "weight", gain.isTrue() ? numberOf(gain) : 1.0)));
}

void XmlTransMetafile::readDecoders(const XmlNode& node, AnyDict& to) {
    AnyVector decoders;
    for (int i = 0; i < node.nrChildren(); ++i) {
        const XmlNode& child = *node.child(i);
        const Any &file = child.getAttr("file"), &decoder = child.getAttr("decoder");
        if (!isNamed(child, "dec"))
            warn(std::string("Interleave: unknown tag ") + nameOf(child));
        else if (!file.isValid() || !decoder.isValid())
            warn("Interleave: invalid dec node");
        else
            decoders.append(Any(AnyDict("file", resolved(file), "dec", decoder)));
    }
    if (!decoders.empty()) to.set("decoders", std::move(decoders));
}

void XmlTransMetafile::readFilters(const XmlNode& node, AnyDict& to) {
    AnyVector& filters = to.set("filters", AnyVector()).asVector();
    for (int i = 0; i < node.nrChildren(); ++i) {
        const XmlNode& child = *node.child(i);
        const Any &file = child.getAttr("file"), &stream = child.getAttr("streamNr");
        if (!file.isValid() || !stream.isValid() || child.nrChildren() != 1) {
            warn("Interleave: invalid filters node");
            continue;
        }
        AnyDict& entry =
            filters.append(Any(AnyDict("file", resolved(file), "stream", integerOf(stream)))).asDict();
        XmlToDict(child.child(0), entry.set("filters", AnyDict()).asDict());
    }
}

// --- Writing.

void XmlTransMetafile::AnyToXml(const Any& from, XmlNode* to) {
    if (!isNamed(*to, audioName)) return XmlTrans::AnyToXml(from, to);
    QV_ASSERT(from.isDict());
    writeAudio(from.asDict(), *to);
}

void XmlTransMetafile::writeAudio(const AnyDict& from, XmlNode& to) {
    to.setName(audioName);
    QV_ASSERT_MSG(from.get("outChannels").isVector(), "outChannels.isVector()");
    XmlNode& channels = addNode(to, "channels");
    for (const Any& output : from.getVector("outChannels")) {
        if (!output.isDict()) continue;
        XmlNode& channel = addNode(channels, "ch");
        setText(channel, "pos", output.asDict().get("pos"));
        if (!output.asDict().get("source").isVector()) continue;
        for (const Any& source : output.asDict().getVector("source"))
            if (source.isDict()) writeSource(source.asDict(), channel);
    }
    if (from.get("decoders").isVector()) writeDecoders(from.getVector("decoders"), addNode(to, "decoders"));
    if (!from.get("filters").isVector()) return;
    XmlNode& filters = addNode(to, "filters");
    for (const Any& entry : from.getVector("filters")) {
        if (!entry.isDict()) continue;
        XmlNode& node = addNode(filters, "stream");
        setText(node, "file", entry.asDict().get("file"));
        node.setAttr("streamNr", Any::sprintf("%d", integerIn(entry.asDict(), "stream")));
        DictToXml(entry.asDict().getDict("filters"), &addNode(node, "filters"));
    }
}
