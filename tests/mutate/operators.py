"""The changes that mutate.py makes: a table of operators, and what of a source they leave alone."""
import dataclasses
import os
import re

# A statement that is a call or an assignment: one line, after the end of another statement or a condition.
START = r"([;{}:)]\s*\n[ \t]*(?:if \([^\n]*\) |else )?)"
PLACE = r"\*?[A-Za-z_][\w:]*(?:\[[^\]\n]*\]|\(\)|\.\w+|->\w+)*"
ARGUMENTS = r"\([^;\n]*\)"
# An operand of ?: with whole pairs of brackets only.
OPERAND = r"((?:[^()?:;,{}\[\]]|::|\((?:[^()]|\([^()]*\))*\)|\[[^\]]*\]|\{[^{}]*\})+?)"

OPERATORS = [  # name, pattern in the bare code, what takes its place
    ("< to <=", r"(?<=\s)<(?=\s)", "<="),
    ("<= to <", r"(?<=\s)<=(?=\s)", "<"),
    ("> to >=", r"(?<=\s)>(?=\s)", ">="),
    (">= to >", r"(?<=\s)>=(?=\s)", ">"),
    ("== to !=", r"(?<=\s)==(?=\s)", "!="),
    ("!= to ==", r"(?<=\s)!=(?=\s)", "=="),
    ("+ to -", r"(?<=[^\"]\s)\+(?==?\s(?!\"))", "-"),
    ("- to +", r"(?<=\s)-(?==?\s)", "+"),
    ("* to /", r"(?<=\s)\*(?==?\s)", "/"),
    ("/ to *", r"(?<=\s)/(?==?\s)", "*"),
    ("% to *", r"(?<=\s)%(?==?\s)", "*"),
    ("0 to 1", r"(?<![\w.'])0(?=[uUlL]*\b(?![.']))", "1"),
    ("1 to 0", r"(?<![\w.'])1(?=[uUlL]*\b(?![.']))", "0"),
    ("n to n+1", r"(?<![\w.'])(?:[2-9]|[1-9][\d']*\d)(?=[uUlL]*\b(?![.']))",
     lambda number: str(int(number.replace("'", "")) + 1)),
    ("&& to ||", r"(?<=\s)&&(?=\s)", "||"),
    ("|| to &&", r"(?<=\s)\|\|(?=\s)", "&&"),
    ("! dropped", r"!(?=[\w(])", ""),
    ("<< to >>", r"(?<=\s)<<(?==?\s)", ">>"),
    (">> to <<", r"(?<=\s)>>(?==?\s)", "<<"),
    ("bit & to |", r"(?<=\s)&(?==?\s)", "|"),
    ("bit | to &", r"(?<=\s)\|(?==?\s)", "&"),
    ("true to false", r"\btrue\b", "false"),
    ("false to true", r"\bfalse\b", "true"),
    ("return of {}", rf"\breturn (?!(?:true|false|nullptr);){PLACE}(?:{ARGUMENTS})?(?=;)", "return {}"),
    ("?: swapped", rf"(?<=\s)\? {OPERAND} : {OPERAND}(?=[;,)}}\]])", r"? \2 : \1"),
    ("call removed", rf"{START}{PLACE}{ARGUMENTS}(?=;)", r"\1"),
    ("assignment removed", rf"{START}{PLACE} (?:[-+*/%&|^]|<<|>>)?= [^;\n]*(?=;)", r"\1"),
    ("step removed", rf"{START}(?:\+\+|--){PLACE}(?=;)", r"\1"),
    ("break to continue", r"\bbreak(?=;)", "continue"),
    ("continue to break", r"\bcontinue(?=;)", "break"),
    ("min to max", r"\b(std::m|hn::M)in\b", r"\1ax"),
    ("max to min", r"\b(std::m|hn::M)ax\b", r"\1in"),
]

TOKEN = re.compile(r'(?P<comment>//[^\n]*|/\*.*?\*/)|(?P<text>R"(?P<end>[^(\s]*)\(.*?\)(?P=end)"|"(?:\\.|[^"\\\n])*"|'
                   r"'(?:\\.|[^'\\\n])+')|\d[\w']*|[A-Za-z_]\w*", re.S)

TYPE_ARGUMENTS = re.compile(r"(?<=\w)<(?:[\w:,*& ]|<[\w:,*& ]*>)*>")

# Declarations that the compiler checks, lists of texts, and what only a log or the speed would show.
LEFT_ALONE = re.compile("|".join([
    r"^[ \t]*#(?:[^\n]*\\\n)*[^\n]*",
    r"\bstatic_assert\([^;]*",
    r"^[ \t]*(?:using|typedef)\b[^;]*",
    r"^[ \t]*template <[^\n]*",
    r"\balignas\([^)]*\)",
    r"^[ \t]*HWY_(?:EXPORT|BEFORE|AFTER)\w*\([^;]*",
    r"(?<!return )(?<!else )(?:(?<=[\w>] )|(?<=\w\* ))\w+\[\d+\]",  # the size of an array
    r"\{[\w:]+, *\{?\"+(?:, *\"+)*\}?\}",  # the row of a list: a number and its texts
    r"[\w.>-]+reserve\([^;]*",
    r"(?:(?<=[;{})\n])|(?<=else))\s*(?:[\w:]+(?:\(\))?(?:\.|->))*(?:debug|warning|info|error|v?logs?|log[A-Z]\w*|"
    r"warn(?:[A-Z]\w*)?|(?:QvUtil::)?debugOut\w*|_traceParam|QV_STEP_LOG|QV_FAIL\w*)\([^;]*",
]), re.M)


def filled(match, filler):
    return re.sub(r"[^\n]", filler, match[0])


def bare_code(source):
    """The source with all that is left alone painted over; each character keeps its position."""
    code = TOKEN.sub(lambda m: filled(m, " ") if m["comment"] else filled(m, '"') if m["text"] else m[0], source)
    code = TYPE_ARGUMENTS.sub(lambda m: filled(m, "_"), code)
    return LEFT_ALONE.sub(lambda m: filled(m, " "), code)


@dataclasses.dataclass(frozen=True)
class Mutant:
    """A source with one change."""
    file: str
    source: str
    operator: str
    start: int
    end: int
    replacement: str

    def text(self):
        return self.source[:self.start] + self.replacement + self.source[self.end:]

    def lines(self):
        """The number of the line where the change begins, and this line without and with the change."""
        same = os.path.commonprefix([self.source[self.start:self.end], self.replacement])
        index = self.source.count("\n", 0, self.start + len(same))
        return index + 1, *(text.split("\n")[index].strip() for text in (self.source, self.text()))

    def __str__(self):
        line, before, after = self.lines()
        return f"{self.file}:{line}: {self.operator}: {before} -> {after}"


def mutants_of(file, source):
    code = bare_code(source)
    for operator, pattern, replacement in OPERATORS:
        for match in re.finditer(pattern, code, re.M):
            if callable(replacement):
                new = replacement(match[0])
            else:
                new = re.sub(r"\\(\d)", lambda group: source[slice(*match.span(int(group[1])))], replacement)
            yield Mutant(file, source, operator, match.start(), match.end(), new)


# --- a test of the table --------------------------------------------------------------------------

SAMPLE = """\
#include <map>  // 1 < 2
template <int N = 3> struct A;
static_assert(sizeof(int) == 4, "x");
int f(const char* text, std::array<int, 4>& a, int* n) {
    char name[16];
    const char* all[7];
    a[1] = 7 - 'x' * 0x10 + 2.5;  // a + b
    if (!text && *n >= 0) return g(text);
    log.debug("%d", 1 + 1);
    std::reverse(a);
    for (; *n < 3; ++*n) break;
    /* a < b */ return true ? std::min(a[0], 1'000) : n->size;
}
constexpr Row rows[] = {{3, "a"}, {"b", 3}};
"""

CHANGED = """\
7: * to /: a[1] = 7 - 'x' / 0x10 + 2.5;  // a + b
7: + to -: a[1] = 7 - 'x' * 0x10 - 2.5;  // a + b
7: - to +: a[1] = 7 + 'x' * 0x10 + 2.5;  // a + b
7: 1 to 0: a[0] = 7 - 'x' * 0x10 + 2.5;  // a + b
7: assignment removed: ;  // a + b
7: n to n+1: a[1] = 8 - 'x' * 0x10 + 2.5;  // a + b
8: ! dropped: if (text && *n >= 0) return g(text);
8: && to ||: if (!text || *n >= 0) return g(text);
8: 0 to 1: if (!text && *n >= 1) return g(text);
8: >= to >: if (!text && *n > 0) return g(text);
8: return of {}: if (!text && *n >= 0) return {};
10: call removed: ;
11: < to <=: for (; *n <= 3; ++*n) break;
11: break to continue: for (; *n < 3; ++*n) continue;
11: n to n+1: for (; *n < 4; ++*n) break;
12: 0 to 1: /* a < b */ return true ? std::min(a[1], 1'000) : n->size;
12: ?: swapped: /* a < b */ return true ? n->size : std::min(a[0], 1'000);
12: min to max: /* a < b */ return true ? std::max(a[0], 1'000) : n->size;
12: n to n+1: /* a < b */ return true ? std::min(a[0], 1001) : n->size;
12: true to false: /* a < b */ return false ? std::min(a[0], 1'000) : n->size;
14: n to n+1: constexpr Row rows[] = {{3, "a"}, {"b", 4}};
"""


def self_test():
    """What the table does to the sample other than it should; empty when all is right."""
    found = {f"{m.lines()[0]}: {m.operator}: {m.lines()[2]}" for m in mutants_of("sample.cpp", SAMPLE)}
    right = set(CHANGED.splitlines())
    return [f"{kind}: {line}" for kind, lines in (("unexpected", found - right), ("missing", right - found))
            for line in sorted(lines)]
