#!/bin/sh
# with_pkg_config.sh SOURCE PREFIX PROGRAM COMPILER [FLAGS...]: builds and runs a program that knows the package only by
# what pkg-config says.
set -eu
source=$1 prefix=$2 program=$3
shift 3

PKG_CONFIG_PATH=$(find "$prefix" -name pkgconfig -type d)
export PKG_CONFIG_PATH
"$@" -std=c++20 "$source" -o "$program" $(pkg-config --cflags --libs vlservice)
LD_LIBRARY_PATH=$(pkg-config --variable=libdir vlservice) "$program"
pkg-config --modversion vlservice
