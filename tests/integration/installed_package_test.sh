#!/usr/bin/env bash
# A program outside of the tree compiles against the installed files and runs, by pkg-config and by
# the CMake package; so does the example of the caller's guide.
#   installed_package_test.sh BUILD_DIR SOURCE_DIR
set -euo pipefail
build=$1 source=$2
work=$(mktemp -d)
cd "$work"

prefix=$work/prefix
if grep -qx ZYROVFS_INSTALLED:BOOL=ON "$build/CMakeCache.txt"; then
  prefix=/usr
else
  cmake --install "$build" --prefix "$prefix" >/dev/null
fi

cat >caller.cpp <<'END'
#include <zyrovfs/zyrovfs_netdrive.h>
#include <iostream>
int main() {
    Json::Value list;
    if (!ZYROVFS::Server::List(4242, ZYROVFS::Server::VFS_CONFIG_SERVER, nullptr, nullptr, true, 0, 0,
                               list)) {
        return 1;
    }
    std::cout << list["total"].asInt() << " profiles\n";
}
END
cat >CMakeLists.txt <<'END'
cmake_minimum_required(VERSION 3.25)
project(caller LANGUAGES CXX)
set(CMAKE_CXX_STANDARD 17)
find_package(zyrovfs 6 REQUIRED)
add_executable(caller caller.cpp)
target_link_libraries(caller PRIVATE zyrovfs::zyrovfs)
END

expect() {
  [ "$2" = "$1" ] || { echo "expected '$1', got '$2'" >&2; exit 1; }
}

export PKG_CONFIG_PATH
PKG_CONFIG_PATH=$(dirname "$(find "$prefix/lib" -name zyrovfs.pc)")
g++ -std=c++17 caller.cpp -o by-pkg-config $(pkg-config --cflags --libs zyrovfs)
export LD_LIBRARY_PATH
LD_LIBRARY_PATH=$(pkg-config --variable=libdir zyrovfs)
expect "0 profiles" "$(./by-pkg-config)"
unset LD_LIBRARY_PATH
echo "by pkg-config: ok"

cmake -S . -B by-cmake -DCMAKE_PREFIX_PATH="$prefix" >/dev/null
cmake --build by-cmake >/dev/null
expect "0 profiles" "$(by-cmake/caller)"
echo "by the CMake package: ok"

sed '1,/^## A complete program$/d' "$source/docs/callers-guide.md" |
  sed -n '/^```cpp$/,/^```$/p' | sed '1d;$d' |
  diff - "$source/docs/example/example.cpp" >&2 || {
  echo "the guide shows another program than docs/example" >&2
  exit 1
}
cmake -S "$source/docs/example" -B example -DCMAKE_PREFIX_PATH="$prefix" >/dev/null
cmake --build example >/dev/null
"$source/tests/support/servers/remote" start secret
useradd --uid 4001 --gid 100 amy
printf 'secret\n' | example/example 4001 127.0.0.1 2121 remo >said
cat said
grep -q '^ftp://remo@127.0.0.1:2121 is at /var/tmp/user/4001/gvfs/' said
echo "the guide's example: ok"
