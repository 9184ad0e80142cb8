#!/bin/sh
# umbrella_is_light.sh PREFIX COMPILER [FLAGS...]: including everything must pull in neither the regular expressions nor
# the Unicode library nor the XML parser: they cost seconds in every source of a program.
set -eu
prefix=$1
shift

headers=$(echo '#include <vlservice/vlservice.h>' | "$@" -std=c++20 -x c++ -I"$prefix/include" -M -)
echo "$headers" | grep -q "$prefix/include/vlservice/presets/presets.h" || { echo "the headers are not listed"; exit 1; }
if echo "$headers" | tr ' ' '\n' | grep -E 'boost/regex|/unicode/|tinyxml'; then
    echo "vlservice.h is not light"
    exit 1
fi
