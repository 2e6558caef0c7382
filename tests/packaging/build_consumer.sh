#!/bin/bash
# build_consumer.sh BUILD COMPILER LIBDIR: installs the build to a scratch prefix, moves the prefix,
# and there builds and runs a small program by the CMake package and by pkg-config, and the README's
# example.
set -euo pipefail
build=$1 compiler=$2 libdir=$3
here=$(cd "$(dirname "$0")" && pwd)
consumer=$here/consumer
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT

cmake --install "$build" --prefix "$scratch/installed" >/dev/null
# Nothing installed may hold on to the place that it was installed to.
prefix=$scratch/prefix
mv "$scratch/installed" "$prefix"

echo "== no installed header names another library's types"
if grep -rnE '\b(zip_t|zip_file|libdeflate_|xml(Doc|Node|Char|SAX)|icu::|U(ErrorCode|Char)|EVP_|sd_|isal_)' \
    "$prefix/include"; then
    exit 1
fi

echo "== CMake package"
cmake -S "$consumer" -B "$scratch/cmake" -G Ninja -DCMAKE_CXX_COMPILER="$compiler" \
    -DCMAKE_PREFIX_PATH="$prefix" >/dev/null
cmake --build "$scratch/cmake"
"$scratch/cmake/consumer"

echo "== pkg-config"
export PKG_CONFIG_PATH=$prefix/$libdir/pkgconfig
read -ra flags <<<"$(pkg-config --cflags --libs ParvelFoundation)"
"$compiler" -std=c++20 "$consumer/main.cpp" -o "$scratch/consumer" "${flags[@]}"
LD_LIBRARY_PATH=$prefix/$libdir "$scratch/consumer"

echo "== README"
sed -n '/^```cpp$/,/^```$/p' "$here/../../README.md" | sed '/^```/d' >"$scratch/example.cpp"
"$compiler" -std=c++20 "$scratch/example.cpp" -o "$scratch/example" "${flags[@]}"
LD_LIBRARY_PATH=$prefix/$libdir "$scratch/example" "$here/../../samples/salt-and-starlight.epub"

echo "== program"
"$prefix/bin/parvel" --version
# Only with its helper program can it tell how that is confined.
"$prefix/bin/parvel" --version --json | grep '"seccomp":true'

echo "== no start pays for the libraries that are loaded on use"
if readelf -d "$prefix/$libdir/libParvelFoundation.so" "$prefix/bin/parvel" |
    grep -E 'NEEDED.*lib(crypto|icui18n|systemd|zip)\.so'; then
    exit 1
fi

echo "== SONAME"
readelf -d "$prefix/$libdir/libParvelFoundation.so" |
    grep -E 'SONAME.*libParvelFoundation\.so\.(0\.[0-9]+|[1-9][0-9]*)\]'
