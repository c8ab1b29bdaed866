#!/usr/bin/env bash
# The style of the house, checked by tools. Prints what is wrong and ends with 1 if anything is.
set -uo pipefail
cd "$(dirname "$(readlink -f "$0")")/../.."
build=build/release  # warnings are errors there
clang_build=build/asan  # the same for clang, and the commands that clang-tidy understands
all=0
[ "${1:-}" = --all ] && all=1
bad=0
jobs=$(nproc)

check() {  # NAME COMMAND...: a check passes when its command does
    printf '== %s\n' "$1"
    shift
    "$@" || bad=1
}

sources() { git ls-files -- '*.cpp' '*.h'; }

formatted() { sources | xargs clang-format --dry-run -Werror; }

no_warnings() {
    cmake --preset release >/dev/null || return 1
    cmake --build $build -j "$jobs" -- -k 0 | grep -vE '^\[|^ninja: Entering' | head -60
    return "${PIPESTATUS[0]}"
}

# Sources that changed in the last day of commits or since, with those of changed headers; all of them with --all.
# A file that only moved has not changed.
changed() {
    local day_before base
    day_before=$(($(git log -1 --format=%ct) - 86400))
    base=$(git rev-list -1 --before=$day_before HEAD)
    {
        git diff --name-only -M --diff-filter=AM "${base:-HEAD}" -- '*.cpp' '*.h'
        git ls-files --others --exclude-standard -- '*.cpp' '*.h'
    } | sed 's/\(_p\)\{0,1\}\.h$/.cpp/' | sort -u
}

tidied() {
    local sources
    sources=$(git ls-files --cached --others --exclude-standard -- 'core/*.cpp' 'builtin/*.cpp' 'plugins/*.cpp' 'tarsel/*.cpp')
    if [ $all = 1 ]; then echo "$sources"; else comm -12 <(sort <<<"$sources") <(changed); fi
}

tidy() {
    [ -f $clang_build/build.ninja ] || cmake --preset asan >/dev/null || return 1
    cmake --build $clang_build --target qv_sounds >/dev/null || return 1
    local found
    found=$(tidied | xargs -r -P "$jobs" -n 6 clang-tidy -p $clang_build --quiet 2>/dev/null |
        grep -E '(warning|error):' | sort -u)
    [ -z "$found" ] || { echo "$found"; return 1; }
}

# Each installed header compiles alone, without warnings.
headers_alone() {
    git ls-files -- 'core/*.h' | grep -v '_p\.h$' | grep -v '/posix/' |
        xargs -P "$jobs" -I{} sh -c 'echo "#include \"{}\"" |
            g++ -std=c++20 -fsyntax-only -Wall -Wextra -I. -x c++ - || { echo "not alone: {}"; exit 255; }'
}

# Includes go down the floors, a class is in one source, and the system is called in one place.
rooms() { python3 tests/lint/rooms.py; }
one_source() { python3 tests/lint/oneclass.py; }
door() { python3 tests/lint/door.py; }

# The shared library exports the public interface and nothing else.
exported_symbols() {
    nm -DC --defined-only $build/lib/libqvplugcore.so | awk '{ $1 = $2 = ""; print substr($0, 3) }' |
        python3 tests/lint/exported_symbols.py
}

# Commands of the README exist and its two main ones are what CI runs.
readme_commands() {
    python3 tests/lint/readme_commands.py
}

# Documents that are made from the tool and the examples.
tables() { python3 tests/lint/tables.py $build/bin/tarsel; }

check 'format' formatted
check 'warnings' no_warnings
check 'headers alone' headers_alone
check 'rooms' rooms
check 'one source a class' one_source
check "the system's door" door
check 'exported symbols' exported_symbols
check 'README commands' readme_commands
check 'documents' tables
check 'clang-tidy' tidy

[ $bad = 0 ] && echo 'lint: clean' || echo 'lint: see above'
exit $bad
