#!/usr/bin/env bash
set -euo pipefail
build=$1
host=$2
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
cmake --install "$build" --prefix "$work/prefix" >/dev/null
libdir=$(find "$work/prefix" -name 'libOxQelDll.so' -printf '%h\n' | head -n1)
include=$work/prefix/include/oxqel

# Every installed header stands on its own: it compiles alone against the package.
for h in $(cd "$include" && find . -name '*.h' | sed 's|^\./||'); do
  echo "#include \"$h\"" | c++ -std=c++20 -fsyntax-only -I"$include" -x c++ - \
    || { echo "install test: $h does not compile on its own"; exit 1; }
done

cmake -S "$host" -B "$work/host" -G Ninja -DCMAKE_PREFIX_PATH="$work/prefix" >/dev/null
cmake --build "$work/host" >/dev/null
LD_LIBRARY_PATH=$libdir "$work/host/oxqel_host" "$work/host.log"

export PKG_CONFIG_PATH=$libdir/pkgconfig
c++ $(pkg-config --cflags oxqel) "$host/main.cpp" -o "$work/host-pc" $(pkg-config --libs oxqel)
LD_LIBRARY_PATH=$libdir "$work/host-pc" "$work/host-pc.log"
echo "install test: both host builds ran"
