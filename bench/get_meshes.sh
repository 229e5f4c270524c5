#!/usr/bin/env bash
# Installs the real meshes of the clash benchmark from Debian packages and unpacks them into a
# folder (default: bench/meshes, which git ignores). Nothing here is committed.
set -euo pipefail
out=${1:-"$(dirname "$0")/meshes"}
mkdir -p "$out"

packages=(libcgal-demo occt-misc openfoam-examples)
missing=()
for p in "${packages[@]}"; do
  dpkg -s "$p" >/dev/null 2>&1 || missing+=("$p")
done
if [ ${#missing[@]} -gt 0 ]; then
  export DEBIAN_FRONTEND=noninteractive
  apt-get update -qq
  apt-get install -y -qq --no-install-recommends "${missing[@]}"
fi

tar xzf /usr/share/doc/libcgal-dev/data.tar.gz -C "$out" data/meshes/armadillo.off
mv "$out/data/meshes/armadillo.off" "$out/armadillo.off"
rm -rf "$out/data"
cp /usr/share/opencascade/data/stl/head.stl "$out/head.stl"
examples=/usr/share/doc/openfoam-examples/examples
gunzip -c "$examples/resources/geometry/motorBike.obj.gz" > "$out/motorBike.obj"
gunzip -c "$examples/incompressible/simpleFoam/windAroundBuildings/constant/triSurface/buildings.obj.gz" \
  > "$out/buildings.obj"
ls -l "$out"
