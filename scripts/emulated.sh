# The lane for 64-bit ARM Linux: cross-built, and run under qemu's user emulation.
# To be sourced after common.sh.

aarch64_packages=(g++-aarch64-linux-gnu qemu-user googletest)

# GoogleTest for that processor, made once, and the headers of others, which are the same for all.
make_aarch64_root() {
    local root=$top/build/aarch64-root work
    mkdir -p "$root/include" "$root/share/cmake"
    ln -sfn /usr/include/{boost,nlohmann,valijson} "$root/include/"
    ln -sfn /usr/share/cmake/nlohmann_json "$root/share/cmake/"
    [ ! -e "$root/made" ] || return 0
    work=$(mktemp -d)
    { cmake -G Ninja -S /usr/src/googletest -B "$work" -DCMAKE_BUILD_TYPE=Release -DCMAKE_INSTALL_PREFIX="$root" \
        -DCMAKE_TOOLCHAIN_FILE="$top/cmake/aarch64-linux-gnu.cmake" -DZANBASE_AARCH64_ROOT="$root" &&
        cmake --build "$work" --target install; } >"$root/log" 2>&1 ||
        fail "cannot build GoogleTest for aarch64; see build/aarch64-root/log"
    rm -rf "$work"
    touch "$root/made"
}

# LIMIT|TESTS|REASON: tests (an expression for ctest) that are left out where aarch64_limits.c meets LIMIT under the
# emulator; `always` holds everywhere.
aarch64_skips="\
clone-without-signal|Console\.IsAWindow.*|the emulator has no clone whose end raises no signal
line-at-abort|Allocator\.EndsTheProcessIfAShortage.*|the emulator writes a line of its own when a signal ends a process
always|[A-Za-z]*Model\..*|the steps explored are those of the release lane, and take minutes here"

# Builds and runs; says at the end which tests were left out, and why.
run_aarch64_lane() {
    local limits limit tests reason number=0 without=() told=()
    echo "== aarch64"
    make_aarch64_root
    configure_and_build aarch64
    aarch64-linux-gnu-gcc -O1 "$top/scripts/aarch64_limits.c" -o "$top/build/aarch64/limits"
    limits=$(qemu-aarch64 -L /usr/aarch64-linux-gnu "$top/build/aarch64/limits")
    cd "$top"
    while IFS='|' read -r limit tests reason; do
        grep -qx "$limit" <<<"always"$'\n'"$limits" || continue
        number=$(ctest --preset aarch64 -N -R "$tests" | sed -n 's/^Total Tests: //p')
        [ "$number" -gt 0 ] || fail "no test is called $tests; see scripts/aarch64.sh"
        without+=("$tests")
        told+=("left out: $number of $tests: $reason")
    done <<<"$aarch64_skips"
    ctest --preset aarch64 -E "^($(IFS='|' && echo "${without[*]}"))\$"
    printf '%s\n' "${told[@]}"
}
