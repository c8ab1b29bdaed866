#include "tarsel/cluster/shellword.h"

std::string shellWord(const std::string& text) {
    std::string word = "'";
    for (const char c : text) {
        // sbatch refuses a script with CR LF as one of DOS. '' between the two changes nothing for the shell.
        if (c == '\n' && word.back() == '\r') word += "''";
        word += c == '\'' ? std::string("'\\''") : std::string(1, c);
    }
    return word + "'";
}
