#!/bin/sh
# Installs the build tree into a fresh prefix whose path holds spaces, then
# builds programs against the installed tree alone and runs them with no
# LD_LIBRARY_PATH: a C program with the flags of pkg-config, then the same
# examples through find_package (C, and Fortran when it was built).
#   install_test.sh BUILD WORK SOURCE CC GENERATOR [FC]
set -eu
build=$1 work=$2 source=$3 cc=$4 generator=$5 fc=${6:-}
prefix="$work/installed tree/with spaces"
rm -rf "$work"
mkdir -p "$work"
cmake --install "$build" --prefix "$prefix" >"$work/install.log"
unset LD_LIBRARY_PATH DYLD_LIBRARY_PATH

# pkg-config alone: its flags quote the spaces with backslashes, which the
# shell reads back with eval (as make does).
PKG_CONFIG_PATH=$(dirname "$(find "$prefix" -name tova.pc)")
export PKG_CONFIG_PATH
flags=$(pkg-config --cflags --libs tova)
eval "\"\$cc\" -std=c99 \"\$source/examples/grd_write.c\" -o \"\$work/grd write\" $flags -lm"
"$work/grd write" "$work/result.grd"

# find_package alone.
fortran=OFF
[ -n "$fc" ] && [ -f "$(dirname "$(find "$prefix" -name tovaConfig.cmake)")/tovaFortranTargets.cmake" ] && fortran=ON
cmake -S "$source/tests/install/consumer" -B "$work/consumer" -G "$generator" -DCMAKE_C_COMPILER="$cc" \
  ${fc:+-DCMAKE_Fortran_COMPILER="$fc"} -DCMAKE_PREFIX_PATH="$prefix" -DEXAMPLES="$source/examples" \
  -DWITH_FORTRAN=$fortran >"$work/consumer.log"
cmake --build "$work/consumer" >>"$work/consumer.log"
"$work/consumer/grd_read" "$work/result.grd" 3
if [ $fortran = ON ]; then
  "$work/consumer/engine_fortran" "$work/engine result.grd"
fi

# The installed tool finds the installed libraries by itself too.
"$prefix/bin/tova" check "$work/result.grd"
