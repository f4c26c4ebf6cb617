#!/bin/sh
# Installs the Debian 12 packages VantorHD needs to build, test and plot
# (python3-qgis and python3-paraview: the check that results open in QGIS
# and ParaView, tests/e2e/gis_open.sh).
# Idempotent: packages already present are left as they are.
set -eu
PACKAGES="build-essential cmake ninja-build pkg-config
libtomlplusplus-dev libnetcdf-dev netcdf-bin libfmt-dev libproj-dev proj-data
libmetis-dev libopenmpi-dev openmpi-bin libxml2-dev
libgtest-dev libgmock-dev libbenchmark-dev
python3 python3-numpy python3-matplotlib python3-netcdf4 python3-xarray gmsh
python3-qgis python3-paraview"
missing=""
for p in $PACKAGES; do
  dpkg-query -W -f='${Status}' "$p" 2>/dev/null | grep -q "install ok installed" || missing="$missing $p"
done
if [ -n "$missing" ]; then
  SUDO=""
  [ "$(id -u)" -ne 0 ] && SUDO="sudo"
  echo "install-deps: installing$missing"
  $SUDO apt-get update -qq
  DEBIAN_FRONTEND=noninteractive $SUDO apt-get install -y -qq --no-install-recommends $missing
fi
