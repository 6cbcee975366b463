#!/usr/bin/env bash
# Installs a build and uses it as a program of somebody else's would, linked by CMake and by pkg-config, with nothing
# but the installed files in reach: try_installed.sh BUILD SOURCE prefix|packages
set -euo pipefail
build=$1 source=$2 way=$3
scratch=$(mktemp -d)
trap 'rm -rf "$scratch"' EXIT
case $way in
  prefix)
    cmake --install "$build" --prefix "$scratch/usr" >"$scratch/log"
    ;;
  packages)
    (cd "$scratch" && cpack --config "$build/CPackConfig.cmake" -B "$scratch/deb" >"$scratch/log")
    # What they depend on can be had.
    apt-get install --simulate "$scratch"/deb/*.deb >>"$scratch/log"
    mkdir -p "$scratch"/dpkg/{info,updates,triggers}
    touch "$scratch/dpkg/status"
    dpkg --admindir="$scratch/dpkg" --instdir="$scratch" --force-all --log=/dev/null -i "$scratch"/deb/*.deb >>"$scratch/log" 2>&1
    ;;
esac
cp "$source"/tests/install/{CMakeLists.txt,outside.cpp} "$scratch"
cp "$source/examples/lake.jpg" "$scratch"
cd "$scratch"
libraries=$(dirname "$(find usr -name libpicturezor.so)")
unset PICTUREZOR_MODULE
export LD_LIBRARY_PATH=$PWD/$libraries PKG_CONFIG_PATH=$PWD/$libraries/pkgconfig CMAKE_PREFIX_PATH=$PWD/usr

usr/bin/picturezor scale lake.jpg --percent 50 --kernel box -o expected.png
# A type whose code is in a file of its own.
usr/bin/picturezor convert expected.png --lossless -o expected.jxl
usr/bin/picturezor compare expected.png expected.jxl
cmake -S . -B by_cmake >>log
cmake --build by_cmake >>log
g++ outside.cpp -o by_pkg_config $(pkg-config --cflags --libs picturezor-files)
for program in by_cmake/outside by_cmake/outside_static ./by_pkg_config; do
  # One that is linked statically is beside no module.
  case $program in *_static) export PICTUREZOR_MODULE=$libraries/picturezor/PictureZOR.so ;; *) unset PICTUREZOR_MODULE ;; esac
  echo "$program: $("$program" lake.jpg half.png | tr '\n' ' ')" | tee told
  # A failure of the library is caught outside of it.
  grep -q '960 x 600 no such file.png: No such file or directory' told
  usr/bin/picturezor compare expected.png half.png
done

python=usr/lib/python3/dist-packages
if grep -q '^PICTUREZOR_PYTHON:BOOL=ON' "$build/CMakeCache.txt"; then
  PYTHONPATH=$python /usr/bin/python3 -c "
import picturezor as pz
half = pz.open('lake.jpg').scale(percent=50, kernel='box')
assert half.compare_images(pz.open('expected.jxl')) == 0
half.save('half.png')"
  usr/bin/picturezor compare expected.png half.png
fi
PATH=$PWD/usr/bin:$PATH picturezor-batch 'scale --percent 50 --kernel box' lake.jpg -o 'out/{stem}.png' --workers 1 --quiet
usr/bin/picturezor compare expected.png out/lake.png

rm -r "$libraries/picturezor/types"
(usr/bin/picturezor info expected.jxl || true) 2>&1 | grep -q 'JPEGXL needs types/jpeg_xl.so'
