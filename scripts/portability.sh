# Configurations that others use and no lane has, each built and tested by itself.
# To be sourced after common.sh and emulated.sh.

# NAME|PACKAGES|DESCRIPTION. The options of NAME are in portability_options.
portability_table="\
clang-19|clang-19 libclang-rt-19-dev|clang 19, libstdc++
libc++-19|clang-19 libclang-rt-19-dev libc++-19-dev libc++abi-19-dev googletest|clang 19, libc++
g++-11|g++-11|g++ 11
O0||no optimisation
O3-lto||-O3 with link-time optimisation of every program
native||-march=native
unity||unity build
c++20||C++20
no-libdw||the recorder without libdw
kills-at-once||ZANBASE_KILL_SAFETY=OFF
riscv64|g++-riscv64-linux-gnu|64-bit RISC-V, emulated
powerpc64le|g++-powerpc64le-linux-gnu|POWER, emulated
s390x|g++-s390x-linux-gnu|s390x, emulated"

# portability_options NAME: what it is configured with, in the array `options`.
portability_options() {
    local openmp=$top/build/portability/openmp-19/usr/lib/llvm-19/lib
    local clang=(-DCMAKE_CXX_COMPILER=clang++-19 -DCMAKE_C_COMPILER=clang-19 -DOpenMP_CXX_LIB_NAMES=omp
        "-DOpenMP_CXX_FLAGS=-fopenmp=libomp -isystem $openmp/clang/19/include"
        "-DOpenMP_omp_LIBRARY=$openmp/libomp.so.5")
    case $1 in
    clang-19) options=("${clang[@]}") ;;
    libc++-19)
        options=("${clang[@]}" -DCMAKE_CXX_FLAGS=-stdlib=libc++
            -DCMAKE_PREFIX_PATH="$top/build/portability/libc++-root")
        ;;
    g++-11) options=(-DCMAKE_CXX_COMPILER=g++-11) ;;
    O0) options=(-DCMAKE_BUILD_TYPE=Debug) ;;
    O3-lto) options=(-DCMAKE_CXX_FLAGS_RELEASE='-O3 -DNDEBUG' -DCMAKE_INTERPROCEDURAL_OPTIMIZATION=ON) ;;
    native) options=(-DCMAKE_CXX_FLAGS=-march=native) ;;
    unity) options=(-DCMAKE_UNITY_BUILD=ON) ;;
    c++20) options=(-DCMAKE_CXX_STANDARD=20) ;;
    no-libdw) options=(-DZANBASE_LIBDW=OFF) ;;
    kills-at-once) options=(-DZANBASE_KILL_SAFETY=OFF) ;;
    *)
        options=(-DCMAKE_TOOLCHAIN_FILE="$top/cmake/emulated-linux.cmake" -DZANBASE_PROCESSOR="$1"
            -DZANBASE_EMULATED_ROOT="$top/build/$1-root" -DZANBASE_BUILD_RECORDER=OFF)
        ;;
    esac
}

# The OpenMP runtime of clang 19, whose package excludes that of the distribution's clang.
fetch_openmp_19() {
    local folder=$top/build/portability/openmp-19
    [ ! -e "$folder/made" ] || return 0
    mkdir -p "$folder"
    (cd "$folder" && apt-get download -qq libomp-19-dev libomp5-19 && for file in *.deb; do dpkg -x "$file" .; done)
    touch "$folder/made"
}

# GoogleTest over libc++.
make_libcxx_root() {
    local root=$top/build/portability/libc++-root
    [ ! -e "$root/made" ] || return 0
    cmake -G Ninja -S /usr/src/googletest -B "$root/build" -DCMAKE_CXX_COMPILER=clang++-19 \
        -DCMAKE_CXX_FLAGS=-stdlib=libc++ -DCMAKE_C_COMPILER=clang-19 -DCMAKE_INSTALL_PREFIX="$root" &&
        cmake --build "$root/build" --target install && touch "$root/made"
}

# build_and_test NAME: leaves the outcome for the table in `outcome`.
build_and_test() {
    local folder=$top/build/portability/$1 log=$top/build/portability/$1.log options tests=()
    portability_options "$1"
    if [ -e "/usr/bin/$1-linux-gnu-g++" ]; then make_emulated_root "$1"; fi
    outcome='does not build'
    { cmake --fresh -G Ninja -S "$top" -B "$folder" -DZANBASE_BUILD_TESTS=ON -DZANBASE_BUILD_RECORDER=ON \
        "${options[@]}" && cmake --build "$folder"; } >"$log" 2>&1 || return 0
    if [ -e "/usr/bin/$1-linux-gnu-g++" ]; then
        tests=(run_emulated_tests "$1" "$folder")
    else
        # Package tests build the library anew, with other compilers.
        tests=(ctest --test-dir "$folder" -j 2 --timeout 240 --output-on-failure --no-tests=error -E '^package/')
    fi
    ("${tests[@]}") >>"$log" 2>&1 || true
    outcome=$(sed -n 's/^[0-9]*% tests passed, \([0-9]*\) tests failed out of \([0-9]*\)/\1 of \2 fail/p' "$log")
    outcome="${outcome:-no test ran}, $(grep -c 'warning:' "$log") warnings"
}

run_portability() { # NAME…
    local name packages description outcome table=$top/build/portability/table.md failed=0
    mkdir -p "$top/build/portability"
    need "${build_packages[@]}" "${test_packages[@]}" "${emulated_packages[@]}"
    printf '| Configuration | | Tests |\n|---|---|---|\n' >"$table"
    while IFS='|' read -r name packages description; do
        [ $# = 0 ] || [[ " $* " == *" $name "* ]] || continue
        # shellcheck disable=SC2086
        need $packages
        case $name in *-19) timed 'preparing clang 19' fetch_openmp_19 ;; esac
        case $name in libc++*) make_libcxx_root >"$top/build/portability/libc++-root.log" 2>&1 ;; esac
        timed "$name" build_and_test "$name"
        [[ $outcome == '0 of'* ]] || failed=1
        echo "| $name | $description | $outcome |" | tee -a "$table"
    done <<<"$portability_table"
    [ "$(wc -l <"$table")" -gt 2 ] || fail "no configuration has one of these names: $*"
    [ $failed = 0 ] || fail "not all configurations pass; see build/portability/*.log"
}
