#!/usr/bin/env bash
# Builds and runs the whole test suite. With "sanitize", in a separate build with
# AddressSanitizer and UndefinedBehaviorSanitizer.
source "$(dirname "$0")/setup.sh"
dir=build
options=()
if [ "${1:-}" = "sanitize" ]; then
    dir=build-sanitize
    options=(-DQMX_SANITIZE=ON -DCMAKE_BUILD_TYPE=Debug)
    export ASAN_OPTIONS=check_initialization_order=1:detect_leaks=1:strict_init_order=1
    export UBSAN_OPTIONS=print_stacktrace=1:halt_on_error=1
fi
qmx_build "$dir" "${options[@]}"
ctest --test-dir "$QMX_ROOT/$dir" --output-on-failure -j2
