#!/bin/sh
# The mesh tools: a gmsh channel with two open boundaries (versions 2.2 and
# 4.1 of the format) becomes the same .mesh; .mesh -> .zrnu -> .mesh gives the
# file back unchanged; the engine reads the converted mesh and finds both open
# boundaries with their faces.
# Arguments: path of vantorhd, build directory.
set -eu
vantorhd=$1
bin="$2/bin"
data="$(cd "$(dirname "$0")/../mesh/data" && pwd)"
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
cd "$work"

"$bin/gmsh2mesh" "$data/channel_v22.msh" v22.mesh > /dev/null
"$bin/gmsh2mesh" "$data/channel_v41.msh" v41.mesh > /dev/null
cmp v22.mesh v41.mesh

"$bin/meshconvert" v22.mesh channel.zrnu > /dev/null
"$bin/meshconvert" channel.zrnu back.mesh > /dev/null
cmp v22.mesh back.mesh

cat > run.toml <<'SETUP'
[VantorHD]
[VantorHD.TIME]
number_of_time_steps = 0
[VantorHD.DOMAIN]
file_name = "back.mesh"
[VantorHD.HYDRODYNAMIC_MODULE]
mode = 2
[VantorHD.MODULE_SELECTION]
mode_of_hydrodynamic_module = 2
SETUP
TANO_PROGRESS=NONE "$vantorhd" run.toml > /dev/null
# Boundary table: code, faces, points. Land all round but the two ends; the
# inflow (2) and outflow (3) ends of 200 m at 100 m spacing have two faces each.
grep -Eq '^ +1 +20 +22$' run.log
grep -Eq '^ +2 +2 +1$' run.log
grep -Eq '^ +3 +2 +1$' run.log
grep -q "  Normal run completion" run.log
echo "all checks passed"
