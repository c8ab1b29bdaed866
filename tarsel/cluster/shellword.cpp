#include "tarsel/cluster/shellword.h"

std::string shellWord(const std::string& text) {
    std::string word = "'";
    for (const char c : text) {
        // sbatch takes CR and LF side by side for a script of DOS and refuses it; '' between them is nothing.
        if (c == '\n' && word.back() == '\r') word += "''";
        word += c == '\'' ? std::string("'\\''") : std::string(1, c);
    }
    return word + "'";
}
