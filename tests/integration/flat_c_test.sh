#!/usr/bin/env bash
# zyrocloud.h is a header for C11 and for C++17, and all that it declares is in the shipped library.
#   flat_c_test.sh BUILD_DIR SOURCE_DIR
set -euo pipefail
build=$1 source=$2
work=$(mktemp -d)
cd "$work"

flags="-Wall -Wextra -Wpedantic -Werror -I$source/include $(pkg-config --cflags gio-2.0)"
libraries="-L$build -lzyrovfs $(pkg-config --libs gio-2.0) -Wl,-rpath,$build:$build/platform"

run() {
  said=$("$1")
  [ "$said" = ok ] || { echo "$1 said '$said'" >&2; exit 1; }
  echo "$1: ok"
}

gcc -std=c11 $flags "$source/tests/integration/flat_c.c" -o as-c $libraries
run ./as-c
g++ -std=c++17 $flags -x c++ "$source/tests/integration/flat_c.c" -x none -o as-cpp $libraries
run ./as-cpp

# What the header declares, the program calls.
grep -oE '\b(ZYROCloud_[A-Za-z_]+|[A-Z][a-z]+RootAtime)\(' "$source/include/zyrovfs/zyrocloud.h" |
  tr -d '(' | sort -u >declared
nm -D --undefined-only as-c | awk '{print $NF}' | sed 's/@.*//' | sort -u >called
missing=$(comm -23 declared called)
[ -s declared ] && [ -z "$missing" ] || { echo "not called: $missing" >&2; exit 1; }
echo "every function: ok"
