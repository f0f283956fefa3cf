# Lanes for Linux on other processors: cross-built, and run under qemu's user emulation.
# To be sourced after common.sh.

emulated_packages=(qemu-user googletest)

# make_emulated_root PROCESSOR: GoogleTest for that processor, made once, and the headers of others, which are the same
# for all.
make_emulated_root() {
    local root=$top/build/$1-root work
    mkdir -p "$root/include" "$root/share/cmake"
    ln -sfn /usr/include/{boost,nlohmann,valijson} "$root/include/"
    ln -sfn /usr/share/cmake/nlohmann_json "$root/share/cmake/"
    [ ! -e "$root/made" ] || return 0
    work=$(mktemp -d)
    { cmake -G Ninja -S /usr/src/googletest -B "$work" -DCMAKE_BUILD_TYPE=Release -DCMAKE_INSTALL_PREFIX="$root" \
        -DCMAKE_TOOLCHAIN_FILE="$top/cmake/emulated-linux.cmake" -DZANBASE_PROCESSOR="$1" \
        -DZANBASE_EMULATED_ROOT="$root" && cmake --build "$work" --target install; } >"$root/log" 2>&1 ||
        fail "cannot build GoogleTest for $1; see build/$1-root/log"
    rm -rf "$work"
    touch "$root/made"
}

# LIMIT|TESTS|REASON: tests (an expression for ctest) that are left out where emulated_limits.c meets LIMIT under the
# emulator; `always` holds everywhere.
emulated_skips="\
clone-without-signal|Console\.IsAWindow.*|the emulator has no clone whose end raises no signal
line-at-abort|Allocator\.EndsTheProcessIfAShortage.*|the emulator writes a line of its own when a signal ends a process
always|[A-Za-z]*Model\..*|the steps explored are those of the release lane, and take minutes here"

# run_emulated_tests PROCESSOR BUILD: says at the end which tests were left out, and why.
run_emulated_tests() {
    local limits limit tests reason number without=() reported=()
    "$1-linux-gnu-gcc" -O1 "$top/scripts/emulated_limits.c" -o "$2/limits"
    limits=$("qemu-${1/powerpc/ppc}" -L "/usr/$1-linux-gnu" "$2/limits")
    while IFS='|' read -r limit tests reason; do
        grep -qx "$limit" <<<"always"$'\n'"$limits" || continue
        number=$(ctest --test-dir "$2" -N -R "$tests" | sed -n 's/^Total Tests: //p')
        [ "$number" -gt 0 ] || fail "no test is called $tests; see scripts/emulated.sh"
        without+=("$tests")
        reported+=("left out: $number of $tests: $reason")
    done <<<"$emulated_skips"
    ctest --test-dir "$2" -j 2 --timeout 240 --output-on-failure --no-tests=error \
        -E "^($(IFS='|' && echo "${without[*]}"))\$"
    printf '%s\n' "${reported[@]}"
}

run_aarch64_lane() {
    echo "== aarch64"
    timed 'preparing aarch64' make_emulated_root aarch64
    configure_and_build aarch64
    run_emulated_tests aarch64 "$top/build/aarch64"
}
