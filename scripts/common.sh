# What the scripts share: messages, the versions of tools, and packages that are installed only where they are missing.
# To be sourced; `me` is the script's name in messages.

me=${0##*/}
top=$(cd "$(dirname "${BASH_SOURCE[0]}")/.." && pwd)

# The compilers are the distribution's own. What the style tools find depends on their version.
clang_packages=(clang libomp-dev libclang-rt-dev)
clang_format=clang-format-14
clang_tidy=clang-tidy-14
build_packages=(g++ cmake ninja-build 'libboost1.81-dev|libboost-dev')
test_packages=(pkg-config "${clang_packages[@]}" gettext locales libgtest-dev libgmock-dev
    libvalijson-dev nlohmann-json3-dev libdw-dev relacy-dev xterm xvfb valgrind
    'libc++-14-dev|libc++-19-dev' 'libc++abi-14-dev|libc++abi-19-dev' libprotozero-dev zlib1g-dev catch2
    libbenchmark-dev python3-prometheus-client golang-go)

fail() {
    echo "scripts/$me: $*" >&2
    exit 1
}

# The comment at the head of the calling script is its manual.
print_manual() {
    sed -n '2,/^[^#]/{/^#/s/^# \{0,1\}//p}' "$0"
}

# A script's own options come after this, so that asking for the manual installs and builds nothing.
case ${1:-} in
-h | --help)
    print_manual
    exit
    ;;
esac

refuse_option() {
    fail "unknown option $1; try --help"
}

# timed WHAT COMMAND…: runs COMMAND, and prints WHAT and the time that it took on standard error.
timed() {
    local start=$SECONDS status=0
    printf '%s … ' "$1" >&2
    "${@:2}" || status=$?
    echo "$((SECONDS - start)) s" >&2
    return $status
}

installed() {
    [ "$(dpkg-query -W -f '${db:Status-Status}' "$1" 2>/dev/null)" = installed ]
}

as_root() {
    if [ "$(id -u)" = 0 ]; then "$@"; else sudo "$@"; fi
}

can_be_had() {
    local policy
    policy=$(LC_ALL=C apt-cache policy "$1" 2>/dev/null)
    [[ $policy == *'Candidate: '[^\(]* ]]
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
    timed "installing ${missing[*]}" install_packages "${missing[@]}"
}

install_packages() {
    local log choice name wanted=()
    log=$(mktemp)
    as_root apt-get update -qq >"$log" 2>&1 || fail "cannot install $*: $(tail -n 1 "$log")"
    for choice in "$@"; do
        for name in ${choice//|/ }; do
            if can_be_had "$name"; then break; fi
        done
        wanted+=("$name")
    done
    as_root env DEBIAN_FRONTEND=noninteractive apt-get install -y -qq --no-install-recommends "${wanted[@]}" \
        >"$log" 2>&1 </dev/null || fail "cannot install ${wanted[*]}: $(tail -n 1 "$log")"
    rm -f "$log"
}

# configure_and_build PRESET TARGET…: prints the build's output only if it fails.
configure_and_build() {
    timed "building $1" build_quietly "$@"
}

build_quietly() {
    local preset=$1 log=$top/build/$1.log cache=$top/build/$1/CMakeCache.txt fresh=()
    shift
    mkdir -p "$top/build"
    # A preset's variables don't replace all that a folder was configured with.
    if [ "$top/CMakePresets.json" -nt "$cache" ]; then fresh=(--fresh); fi
    if ! (cd "$top" && cmake --preset "$preset" "${fresh[@]}" && touch "$cache" &&
        cmake --build --preset "$preset" ${1:+--target "$@"}) >"$log" 2>&1; then
        echo >&2
        tail -n 60 "$log" >&2
        fail "the $preset build failed; its whole output is in build/$preset.log"
    fi
}
