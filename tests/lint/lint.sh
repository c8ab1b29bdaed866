#!/usr/bin/env bash
# The style of the house, checked by tools. Prints what is wrong and ends with 1 if anything is.
set -uo pipefail
cd "$(dirname "$(readlink -f "$0")")/../.."
build=build/release  # warnings are errors there
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

tidy() {
    git ls-files -- 'core/*.cpp' 'builtin/*.cpp' 'tarsel/*.cpp' |
        xargs -P "$jobs" -n 6 clang-tidy -p $build --quiet --extra-arg=-Wno-unknown-warning-option 2>/dev/null | grep -E '(warning|error):' | sort -u
    return $((PIPESTATUS[2] == 0))
}

# Each installed header compiles alone, without warnings.
headers_alone() {
    git ls-files -- 'core/*.h' | grep -v '_p\.h$' | grep -v '/posix/' |
        xargs -P "$jobs" -I{} sh -c 'echo "#include \"{}\"" |
            g++ -std=c++20 -fsyntax-only -Wall -Wextra -I. -x c++ - || { echo "not alone: {}"; exit 255; }'
}

# Headers include their own room or those below it, never above.
include_order() {
    python3 tests/lint/include_order.py
}

# The shared library exports the public interface and nothing else.
exported_symbols() {
    nm -DC --defined-only $build/lib/libqvplugcore.so | awk '{ $1 = $2 = ""; print substr($0, 3) }' |
        python3 tests/lint/exported_symbols.py
}

# Commands of the README exist and its two main ones are what CI runs.
readme_commands() {
    python3 tests/lint/readme_commands.py
}

check 'format' formatted
check 'warnings' no_warnings
check 'headers alone' headers_alone
check 'include order' include_order
check 'exported symbols' exported_symbols
check 'README commands' readme_commands
check 'clang-tidy' tidy

[ $bad = 0 ] && echo 'lint: clean' || echo 'lint: see above'
exit $bad
