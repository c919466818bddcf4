#!/usr/bin/env bash
# The main job: builds the library and runs the example program.
source "$(dirname "$0")/setup.sh"
qmx_build build
cd "$QMX_ROOT"
exec "$QMX_ROOT/build/examples/corr_example" "$@"
