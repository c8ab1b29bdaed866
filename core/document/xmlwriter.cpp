#include "core/document/xmlwriter_p.h"

#include <algorithm>
#include <cctype>
#include <cstdio>
#include <cstring>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include <expat.h>

#include "core/arch/qvexception.h"
#include "core/document/xmltext_p.h"
#include "core/engine/files/qvfileutil.h"
#include "core/value/anytext_p.h"
#include "core/value/utf.h"

namespace {

const char* escapeOf(char c) {
    switch (c) {
        case '"': return "&quot;";
        case '&': return "&amp;";
        case '\'': return "&apos;";
        case '<': return "&lt;";
        case '>': return "&gt;";
        default: return nullptr;
    }
}

bool mayStand(char32_t c) {
    return (c >= 0x20 && c != 0xFFFE && c != 0xFFFF) || c == '\t' || c == '\n' || c == '\r';
}

void appendEscaped(std::string& out, std::string_view text) {
    for (std::size_t position = 0; position < text.size();) {
        const char c = text[position];
        if (const char* const escape = escapeOf(c)) {
            out += escape;
            ++position;
        } else if (c >= 0x20) {
            out += c;
            ++position;
        } else {
            const char32_t character = QvUtf::next(text, position);
            QvUtf::append(out, mayStand(character) ? character : QvUtf::replacement);
        }
    }
}

std::string utf8Of(const Any& value) {
    if (value.isWString()) return QvUtf::toUtf8(qvWideView(value));
    return std::string(qvNarrowView(value));
}

// Walks the tree without recursion and hands the text to the stream in large pieces.
class Writer {
  public:
    Writer(std::FILE* stream, int indent) : stream_(stream), indent_(indent) {}

    void write(const XmlNode& root) {
        open(root);
        while (!path_.empty()) {
            const Level level = path_.back();
            if (level.next < level.node->nrChildren()) {
                ++path_.back().next;
                const XmlNode& child = *level.node->child(level.next);
                if (child.name()) open(child);
            } else {
                path_.pop_back();
                close(*level.node);
            }
        }
        flush();
    }
    bool failed() const { return failed_; }  // the stream has not taken all

  private:
    struct Level {
        const XmlNode* node;
        int next;  // child
    };

    std::FILE* stream_;
    int indent_;
    std::string out_;
    bool failed_ = false;
    std::vector<Level> path_;  // elements whose children are being written

    void indent() { out_.append(2 * (static_cast<std::size_t>(indent_) + path_.size()), ' '); }

    void open(const XmlNode& node) {
        indent();
        out_.append("<").append(node.name());
        for (const auto [name, value] : node.attrs()) {
            out_.append(" ").append(name).append("=\"");
            appendEscaped(out_, utf8Of(*value));
            out_ += '"';
        }
        if (node.nrChildren() == 0 && node.dataSize() == 0) {
            out_ += "/>\n";
        } else if (node.nrChildren() == 0) {
            out_ += '>';
            close(node);
        } else {
            out_ += ">\n";
            path_.push_back({&node, 0});
        }
        if (out_.size() >= 1 << 16) flush();
    }

    void close(const XmlNode& node) {
        appendEscaped(out_, {node.data(), static_cast<std::size_t>(node.dataSize())});
        if (node.nrChildren() > 0) indent();
        out_.append("</").append(node.name()).append(">\n");
    }

    void flush() {
        failed_ |= std::fwrite(out_.data(), 1, out_.size(), stream_) != out_.size();
        out_.clear();
    }
};

[[noreturn]] void refuse(const Any& path, const std::string& reason) {
    const Any name = path.toString();
    throw QvFileException(
        Any::sprintf("Can not store '%s': %s", name.asString(""), reason.c_str()).asString());
}

// Throws for a tree that would make a file which can't be read again.
void checkTree(const Any& path, const XmlNode& root) {
    struct Item {
        const XmlNode* node;
        int depth;
    };
    std::vector<Item> pending{{&root, 1}};
    while (!pending.empty()) {
        const auto [node, depth] = pending.back();
        pending.pop_back();
        if (!node->name()) continue;
        if (depth > XmlParser::maxDepth) refuse(path, "elements nested too deep");
        if (!qvIsXmlName(node->name())) refuse(path, std::string("invalid name '") + node->name() + "'");
        for (const auto [name, value] : node->attrs())
            if (!qvIsXmlName(name)) refuse(path, std::string("invalid attribute '") + name + "'");
        for (int i = 0; i < node->nrChildren(); ++i) pending.push_back({node->child(i), depth + 1});
    }
}

bool isStandard(const std::FILE* stream) { return stream == stdout || stream == stderr; }

std::FILE* openTarget(const Any& path, const Any& name) {
    if (name == "stderr") return stderr;
    if (name == "stdout") return stdout;
    return static_cast<std::FILE*>(qvfopen(path, "w"));
}

}  // namespace

// Names beyond ASCII are left to the judgement of expat, which will have to read them.
bool qvIsXmlName(const char* name) {
    const std::string_view text(name);
    if (text.find_first_of(" \t\r\n/><=\"'&") != std::string_view::npos) return false;
    if (qvIsAscii(text)) {
        const auto isStart = [](char c) { return std::isalpha(c) || c == '_' || c == ':'; };
        const auto isInner = [&](char c) { return isStart(c) || std::isdigit(c) || c == '-' || c == '.'; };
        return !text.empty() && isStart(text[0]) && std::ranges::all_of(text, isInner);
    }
    const std::unique_ptr<XML_ParserStruct, void (*)(XML_Parser)> expat(XML_ParserCreate("UTF-8"),
                                                                        XML_ParserFree);
    const std::string document = std::string("<").append(text).append("/>");
    return expat &&
           XML_Parse(expat.get(), document.data(), static_cast<int>(document.size()), 1) == XML_STATUS_OK;
}

int qvWriteXml(const XmlNode& root, std::FILE* stream, int indent) {
    Writer writer(stream, indent);
    writer.write(root);
    return writer.failed() ? -1 : 0;
}

void qvStoreXml(const Any& path, const XmlNode& root, const char* doctype) {
    checkTree(path, root);
    const Any name = path.toString();
    std::FILE* const stream = openTarget(path, name);
    if (!stream)
        throw QvFileException(Any::sprintf("Can not open '%s' for writing", name.asString("")).asString());

    const bool begun = std::fputs("<?xml version=\"1.0\" encoding=\"UTF-8\" ?>\n", stream) >= 0 &&
                       (!doctype || std::fprintf(stream, "<!DOCTYPE %s>\n", doctype) >= 0);
    const bool taken = begun && qvWriteXml(root, stream, 0) == 0;
    const bool failed = !taken || std::fflush(stream) != 0 || std::ferror(stream);
    const bool closed = isStandard(stream) || std::fclose(stream) == 0;
    if (failed || !closed)
        throw QvFileException(Any::sprintf("Can not write '%s'", name.asString("")).asString());
}
