# What the scripts share: messages, and packages that are installed only where they are missing.
# To be sourced; `me` is the script's name in messages.

me=${0##*/}
top=$(cd "$(dirname "${BASH_SOURCE[0]}")/.." && pwd)

fail() {
    echo "scripts/$me: $*" >&2
    exit 1
}

# The comment at the head of the calling script is its manual.
print_manual() {
    sed -n '2,/^[^#]/{/^#/s/^# \{0,1\}//p}' "$0"
}

installed() {
    [ "$(dpkg-query -W -f '${db:Status-Status}' "$1" 2>/dev/null)" = installed ]
}

as_root() {
    if [ "$(id -u)" = 0 ]; then "$@"; else sudo "$@"; fi
}

# need PACKAGE…: installs those that are missing (Debian and Ubuntu); `a|b` takes b where a can't be had.
need() {
    command -v dpkg-query >/dev/null || fail "needs Debian or Ubuntu; elsewhere install the like of: $*"
    local missing=() choice name
    for choice in "$@"; do
        for name in ${choice//|/ }; do
            installed "$name" && continue 2
        done
        missing+=("$choice")
    done
    [ ${#missing[@]} -gt 0 ] || return 0
    [ "$(id -u)" = 0 ] || command -v sudo >/dev/null || fail "cannot install ${missing[*]}: neither root nor sudo"
    echo "installing: ${missing[*]}" >&2
    local log
    log=$(mktemp)
    as_root apt-get update -qq >"$log" 2>&1 || fail "cannot install ${missing[*]}: $(tail -n 1 "$log")"
    local wanted=()
    for choice in "${missing[@]}"; do
        for name in ${choice//|/ }; do
            if apt-cache show "$name" >/dev/null 2>&1; then break; fi
        done
        wanted+=("$name")
    done
    as_root env DEBIAN_FRONTEND=noninteractive apt-get install -y -qq --no-install-recommends "${wanted[@]}" \
        >"$log" 2>&1 </dev/null || fail "cannot install ${wanted[*]}: $(tail -n 1 "$log")"
    rm -f "$log"
}

build_packages=(g++ cmake ninja-build 'libboost1.81-dev|libboost-dev')
test_packages=(pkg-config clang-14 libomp-14-dev libclang-rt-14-dev gettext locales libgtest-dev libgmock-dev
    libvalijson-dev nlohmann-json3-dev libdw-dev relacy-dev xterm xvfb valgrind)

# configure_and_build PRESET TARGET…: prints the build's output only if it fails.
configure_and_build() {
    local preset=$1 log=$top/build/$1.log
    shift
    mkdir -p "$top/build"
    if ! (cd "$top" && cmake --preset "$preset" && cmake --build --preset "$preset" ${1:+--target "$@"}) \
        >"$log" 2>&1; then
        tail -n 60 "$log" >&2
        fail "the $preset build failed; its whole output is in build/$preset.log"
    fi
}
