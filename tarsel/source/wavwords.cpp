#include "tarsel/source/wavwords.h"

#include <algorithm>
#include <iterator>

#include "tarsel/words/xmlnames.h"

namespace {

// The first id of a key is the one that is written.
constexpr struct {
    const char *key, *id;
} kWords[] = {
    {"title", "INAM"}, {"artist", "IART"},  {"album", "IPRD"},     {"date", "ICRD"},  {"genre", "IGNR"},
    {"track", "IPRT"}, {"comment", "ICMT"}, {"copyright", "ICOP"}, {"track", "ITRK"},
};
constexpr const char* kProgram = "ISFT";  // that has written the file

const char* keyOf(const std::string& id) {
    const auto* const row =
        std::find_if(std::begin(kWords), std::end(kWords), [&id](const auto& word) { return id == word.id; });
    return row == std::end(kWords) ? nullptr : row->key;
}

bool isInfo(const Any& chunk) {
    const Any& data = chunk.isDict() ? chunk.asDict().get("data") : Any();
    return chunk.isDict() && chunk.asDict().get("id") == "LIST" && data.isGeneric() && data.size() >= 4 &&
           std::string(static_cast<const char*>(data.asGeneric()), 4) == "INFO";
}

// What the chunks say, in their order: calls visit(id, text).
template <class Visit>
void forEachText(const AnyVector& chunks, Visit visit) {
    const AnyDict described = QvWavChunks::describe(chunks);
    const AnyVector texts = described.getVector("info", AnyVector());
    for (const Any& entry : texts)
        visit(std::string(entry.asDict().getString("id", "")),
              std::string(entry.asDict().getString("text", "")));
}

// What no key stands for stays in the chunk as it is.
bool isKept(const std::string& id, const std::string& text) {
    return !text.empty() && (!keyOf(id) || !xmlKeeps(text));
}

void addText(std::string& list, const std::string& id, const std::string& text) {
    const size_t bytes = text.size() + 1;
    list += id;
    for (int shift = 0; shift < 32; shift += 8) list += static_cast<char>(bytes >> shift & 255);
    list += text;
    list.append(1 + bytes % 2, '\0');
}

std::string wordOf(const AnyDict& words, const char* key) {
    const Any& value = words.get(key);
    return value.isText() ? value.toString().asString("") : "";
}

}  // namespace

bool isWavWord(const std::string& key) {
    return std::any_of(std::begin(kWords), std::end(kWords),
                       [&key](const auto& row) { return key == row.key; });
}

AnyDict wavWords(const AnyVector& chunks) {
    AnyDict words;
    forEachText(chunks, [&words](const std::string& id, const std::string& text) {
        const char* const key = keyOf(id);
        if (key && !text.empty() && xmlKeeps(text) && !words.isSet(key)) words.set(key, text.c_str());
    });
    return words;
}

bool isOfWavWords(const Any& chunk) {
    if (!isInfo(chunk)) return false;
    bool only = true;
    forEachText(AnyVector(chunk), [&only](const std::string& id, const std::string& text) {
        only = only && (id == kProgram || !isKept(id, text));
    });
    return only;
}

AnyVector withWavWords(const AnyVector& chunks, const AnyDict& words) {
    const AnyDict own = wavWords(chunks);
    std::string list = "INFO";
    bool same = true;
    for (const auto& [key, id] : kWords) {
        if (std::string(id) == "ITRK") continue;
        const std::string text = wordOf(words, key);
        same = same && text == wordOf(own, key);
        if (!text.empty()) addText(list, id, text);
    }
    if (same) return chunks;
    forEachText(chunks, [&list](const std::string& id, const std::string& text) {
        if (isKept(id, text)) addText(list, id, text);
    });
    AnyVector result;
    for (const Any& chunk : chunks)
        if (!isInfo(chunk)) result.append(chunk);
    if (list.size() > 4)
        result.append(AnyDict("id", "LIST", "data",
                              Any(static_cast<const void*>(list.data()), static_cast<int>(list.size()))));
    return result;
}
