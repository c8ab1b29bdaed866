#define CRYPTOPP_ENABLE_NAMESPACE_WEAK 1
#include <crypto++/md5.h>
#include <algorithm>
#include <cstdio>
#include <string>

#include "core/engine/qvutil.h"
#include "core/value/nametext_p.h"

namespace {

using Digest = CryptoPP::Weak::MD5;

std::string inWords(const unsigned char* digest, int bytes) {
    std::string text;
    for (int start = 0; start < bytes; start += 4) {
        unsigned word = 0;
        for (int i = std::min(start + 4, bytes); i-- > start;) word = word << 8 | digest[i];
        char hex[16];
        std::snprintf(hex, sizeof hex, "%x", word);
        text += hex;
    }
    return text;
}

}  // namespace

Any QvUtil::md5Digest(const Any& value, int maxChars) {
    std::string bytes;
    if (value.isText())
        bytes = qvname::narrow(value);
    else if (value.isGeneric() && value.size() > 0)
        bytes.assign(static_cast<const char*>(value.asGeneric()), static_cast<std::size_t>(value.size()));
    else
        return Any();
    unsigned char digest[Digest::DIGESTSIZE];
    Digest().CalculateDigest(digest, reinterpret_cast<const unsigned char*>(bytes.data()), bytes.size());
    const std::string text = inWords(digest, std::clamp<int>(maxChars / 2, 0, Digest::DIGESTSIZE));
    return Any(text.c_str());
}
