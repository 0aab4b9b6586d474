#!/usr/bin/env bash
# Installs the build into a prefix of its own and uses it from outside: a C
# program built with pkg-config and with find_package(Quillmere), and the
# Python package, each printing the library version.
#   install_test.sh BUILD_DIR LIBDIR C_COMPILER PYTHON [SANITIZER_FLAGS [PRELOAD]]
set -euo pipefail
build=$1 libdir=$2 cc=$3 python=$4 sanitize=${5:-} preload=${6:-}
here=$(cd "$(dirname "$0")" && pwd)
source_dir=$(cd "$here/../.." && pwd)
version=6.14

scratch=$(mktemp -d "${TMPDIR:-/tmp}/qm-install-XXXXXX")
trap 'rm -rf "$scratch"' EXIT
prefix=$scratch/prefix
failures=0
fail() { echo "FAIL: $*" >&2; failures=$((failures + 1)); }
expect_output() {  # what, expected, command...
  local what=$1 expected=$2 out
  shift 2
  if ! out=$("$@" 2>"$scratch/stderr"); then
    fail "$what exited non-zero: $(cat "$scratch/stderr")"
  elif [[ "$out" != "$expected" ]]; then
    fail "$what printed '$out', not '$expected'"
  else
    echo "ok: $what printed $out"
  fi
}

cmake --install "$build" --prefix "$prefix" >"$scratch/install.log"

# What the install must hold.
for path in "$libdir/libquillmere.so.$version" "$libdir/libquillmere.so.6" "$libdir/libquillmere.so" \
            include/quillmere/quillmere.h include/quillmere/api_search.h bin/quillmere \
            share/quillmere/Language/English/stop.txt share/quillmere/System \
            "$libdir/cmake/Quillmere/QuillmereConfig.cmake" \
            "$libdir/cmake/Quillmere/QuillmereConfigVersion.cmake" \
            "$libdir/pkgconfig/quillmere.pc" \
            share/quillmere/python/quillmere/__init__.py \
            share/quillmere/python/quillmere/_installed.py; do
  [[ -e "$prefix/$path" ]] || fail "not installed: $path"
done
for data in "$source_dir"/data/*; do
  [[ -e "$prefix/share/quillmere/$(basename "$data")" ]] || fail "not installed: data/$(basename "$data")"
done
[[ "$(readlink "$prefix/$libdir/libquillmere.so.6")" == "libquillmere.so.$version" ]] ||
  fail "libquillmere.so.6 does not link to libquillmere.so.$version"
if find "$prefix" -name '*.a' | grep -q .; then fail "a static library was installed"; fi
if grep -rq quillmere_engine "$prefix/$libdir/cmake"; then
  fail "the CMake package names the static engine"
fi

export LD_LIBRARY_PATH="$prefix/$libdir"

# pkg-config
export PKG_CONFIG_PATH="$prefix/$libdir/pkgconfig"
pc_version=$(pkg-config --modversion quillmere)
[[ "$pc_version" == "$version" ]] || fail "pkg-config gives version $pc_version"
read -r -a pc_flags <<<"$(pkg-config --cflags --libs quillmere)"
read -r -a san_flags <<<"$sanitize"
if "$cc" -std=c99 -pedantic -Wall -Wextra -Werror "${san_flags[@]}" "$here/version_probe.c" \
     "${pc_flags[@]}" -o "$scratch/probe_pkgconfig" 2>"$scratch/cc.log"; then
  expect_output "the program built with pkg-config" "$version" "$scratch/probe_pkgconfig"
else
  fail "cc with pkg-config's flags: $(cat "$scratch/cc.log")"
fi

# find_package(Quillmere)
if cmake -S "$here/consumer" -B "$scratch/consumer" -DCMAKE_PREFIX_PATH="$prefix" \
     -DCMAKE_C_COMPILER="$cc" -DCMAKE_C_FLAGS="$sanitize" -DCMAKE_EXE_LINKER_FLAGS="$sanitize" \
     >"$scratch/consumer.log" 2>&1 &&
   cmake --build "$scratch/consumer" >>"$scratch/consumer.log" 2>&1; then
  expect_output "the program built with find_package" "$version" "$scratch/consumer/version_probe"
else
  fail "the CMake consumer did not build: $(cat "$scratch/consumer.log")"
fi
# The version file refuses another major version.
sed 's/find_package(Quillmere 6.14 REQUIRED)/find_package(Quillmere 7 REQUIRED)/' \
  "$here/consumer/CMakeLists.txt" >"$scratch/CMakeLists.txt"
mkdir -p "$scratch/wrong-major"
sed "s|\${CMAKE_CURRENT_SOURCE_DIR}/../version_probe.c|$here/version_probe.c|" \
  "$scratch/CMakeLists.txt" >"$scratch/wrong-major/CMakeLists.txt"
if cmake -S "$scratch/wrong-major" -B "$scratch/wrong-major/build" -DCMAKE_PREFIX_PATH="$prefix" \
     >"$scratch/wrong-major.log" 2>&1; then
  fail "find_package(Quillmere 7) accepted version $version"
elif ! grep -q "$version" "$scratch/wrong-major.log"; then
  fail "find_package(Quillmere 7) failed without naming the installed version"
fi

# The installed Python package finds the installed library by itself.
unset LD_LIBRARY_PATH QUILLMERE_LIBRARY
expect_output "the installed Python package" "$version" \
  env PYTHONPATH="$prefix/share/quillmere/python" LD_PRELOAD="$preload" ASAN_OPTIONS=detect_leaks=0 \
  "$python" -c "import quillmere; print(quillmere.version())"

if ((failures)); then
  echo "$failures failure(s)" >&2
  exit 1
fi
echo "install test passed"
