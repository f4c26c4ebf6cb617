# The engine's element order does not show in any result: a dam break over a
# dry slope (flooding and drying, second order, two stages) on a mixed mesh,
# read in its generated numbering and with elements and nodes numbered at
# random, each run in the file's order (type_of_reordering 0), along the
# Hilbert curve (1) and in reverse Cuthill-McKee order (2), writes the same
# area, point and line files value for value once the random numbering is
# mapped back; element numbers in blow-up and CFL reports are the file's.
. ./driver_common.inc
export TANO_PROGRESS=NONE
PY=/usr/bin/python3

# write_meshes DIR: ordered.mesh (row by row) and shuffled.mesh (the same
# elements and nodes numbered at random; shuffled.map holds, per line, the
# ordered number of shuffled element k, then "nodes" and the same for nodes).
# A basin 300 m x 80 m of 10 m cells with jittered inner nodes, quadrilaterals
# in the western third, triangles elsewhere; the bed rises from 3 m below
# datum in the west to 1.5 m above it in the east; open in the west (code 2).
write_meshes() {
  "$PY" - "$1" <<'PYMESH'
import random, sys
d = sys.argv[1]
nx, ny, h = 30, 8, 10.0
rng = random.Random(7)
def code(i, j):
    if i == 0 and 0 < j < ny: return 2
    return 1 if i in (0, nx) or j in (0, ny) else 0
nodes = []
for j in range(ny + 1):
    for i in range(nx + 1):
        x, y = i * h, j * h
        if 0 < i < nx and 0 < j < ny:
            x += rng.uniform(-2.5, 2.5)
            y += rng.uniform(-2.5, 2.5)
        nodes.append((x, y, -3.0 + 4.5 * i / nx, code(i, j)))
elements = []
for j in range(ny):
    for i in range(nx):
        a = j * (nx + 1) + i + 1
        b, c, e = a + 1, a + nx + 2, a + nx + 1
        if i < nx // 3:
            elements.append([a, b, c, e])
        elif (i + j) % 2:
            elements += [[a, b, c], [a, c, e]]
        else:
            elements += [[a, b, e], [b, c, e]]
def write(name, nodes, elements):
    with open(f"{d}/{name}", "w") as f:
        f.write(f"100079 1000 {len(nodes)} UTM-32\n")
        for k, (x, y, z, c) in enumerate(nodes, 1):
            f.write(f"{k} {500000 + x!r} {6000000 + y!r} {z!r} {c}\n")
        f.write(f"{len(elements)} 4 25\n")
        for k, el in enumerate(elements, 1):
            f.write(f"{k} " + " ".join(map(str, el + [0] * (4 - len(el)))) + "\n")
write("ordered.mesh", nodes, elements)
node_perm = list(range(1, len(nodes) + 1))
element_perm = list(range(1, len(elements) + 1))
rng.shuffle(node_perm)
rng.shuffle(element_perm)
new_node = {old: k for k, old in enumerate(node_perm, 1)}
write("shuffled.mesh", [nodes[n - 1] for n in node_perm],
      [[new_node[n] for n in elements[e - 1]] for e in element_perm])
with open(f"{d}/shuffled.map", "w") as f:
    f.write(" ".join(map(str, element_perm)) + "\nnodes\n" + " ".join(map(str, node_perm)) + "\n")
PYMESH
}

# write_case FILE MESH REORDERING STEPS LEVEL [EXTRA SOLUTION KEYS]
write_case() {
  cat > "$1" <<SETUP
[VantorHD]

[VantorHD.TIME]
start_time = [2004, 1, 1, 0, 0, 0]
time_step_interval = 5.0
number_of_time_steps = $4

[VantorHD.DOMAIN]
file_name = "$2"
type_of_reordering = $3

[VantorHD.MODULE_SELECTION]
mode_of_hydrodynamic_module = 2

[VantorHD.HYDRODYNAMIC_MODULE]
mode = 2

[VantorHD.HYDRODYNAMIC_MODULE.SOLUTION_TECHNIQUE]
CFL_critical_HD = 0.8
scheme_of_time_integration = 2
scheme_of_space_discretization_horizontal = 2
$6

[VantorHD.HYDRODYNAMIC_MODULE.FLOOD_AND_DRY]
type = 1

[VantorHD.HYDRODYNAMIC_MODULE.BED_RESISTANCE]
type = 4
[VantorHD.HYDRODYNAMIC_MODULE.BED_RESISTANCE.MANNING_NUMBER]
format = 0
constant_value = 30.0

[VantorHD.HYDRODYNAMIC_MODULE.INITIAL_CONDITIONS]
type = 1
surface_elevation_constant = -1.0

[VantorHD.HYDRODYNAMIC_MODULE.BOUNDARY_CONDITIONS.CODE_1]
type = 1

[VantorHD.HYDRODYNAMIC_MODULE.BOUNDARY_CONDITIONS.CODE_2]
type = 6
constant_value = $5
type_of_soft_start = 0

[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS]
number_of_outputs = 3

[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1]
file_name = "area.zrnu"
format = 2
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1.PARAMETERS_2D]
SURFACE_ELEVATION = true
TOTAL_WATER_DEPTH = true
CURRENT_SPEED = true
MAXIMUM_WATER_DEPTH = true

[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2]
file_name = "points.zrn0"
format = 0
number_of_points = 2
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2.POINT_1]
name = "Beach"
x = 500201.3
y = 6000033.7
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2.POINT_2]
name = "Inflow"
x = 500017.1
y = 6000052.9
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2.PARAMETERS_2D]
SURFACE_ELEVATION = true
TOTAL_WATER_DEPTH = true

[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_3]
file_name = "line.zrn1"
format = 1
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_3.LINE]
npoints = 40
x_first = 500003.0
y_first = 6000041.0
x_last = 500297.0
y_last = 6000038.0
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_3.PARAMETERS_2D]
SURFACE_ELEVATION = true
CURRENT_SPEED = true
SETUP
}

# run_case NAME MESH REORDERING STEPS LEVEL [EXTRA]: runs in $WORK/NAME.
run_case() {
  d=$(case_dir "$1")
  cp "$WORK/$2" "$d/"
  write_case "$d/setup.toml" "$2" "$3" "$4" "$5" "${6:-}"
  "$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1
  echo $? > "$d/status"
}

write_meshes "$WORK"
for r in 0 1 2; do
  run_case "ordered$r" ordered.mesh "$r" 60 1.0
  run_case "shuffled$r" shuffled.mesh "$r" 60 1.0
done
for r in 0 1 2; do
  for m in ordered shuffled; do
    status_is 0 "$(cat "$WORK/$m$r/status")" "$m mesh, type_of_reordering $r"
  done
done

if ! "$PY" - "$WORK" > "$WORK/compare.out" 2>&1 <<'PYCHECK'
import sys
import numpy as np
import netCDF4

work = sys.argv[1]
with open(f"{work}/shuffled.map") as f:
    lines = f.read().split("\n")
element_perm = np.array(lines[0].split(), dtype=int) - 1  # shuffled k -> ordered
node_perm = np.array(lines[2].split(), dtype=int) - 1
errors = []

def variables(path):
    with netCDF4.Dataset(path) as nc:
        return {name: np.ma.filled(v[:], -999) for name, v in nc.variables.items()}

def area(path):
    v = variables(path)
    conn = v["mesh2d_face_nodes"]
    return v, conn

ref, ref_conn = area(f"{work}/ordered0/area.zrnu")
depth = ref["total_water_depth"]
# Wet: deeper than the default drying depth (a dried element may keep a
# film thinner than that).
wet = depth > 0.005
# The case floods dry land and dries wet land again.
if not (~wet[0] & wet.any(axis=0)).any():
    errors.append("no element floods")
if not (wet[:-1] & ~wet[1:]).any():
    errors.append("no element dries")

for r in (0, 1, 2):
    for kind in ("ordered", "shuffled"):
        if kind == "ordered" and r == 0:
            continue
        name = f"{kind}{r}"
        got, conn = area(f"{work}/{name}/area.zrnu")
        if kind == "shuffled":
            # Element k of the shuffled file is element element_perm[k] of the
            # ordered one; its node n is ordered node node_perm[n].
            inverse = np.empty_like(element_perm)
            inverse[element_perm] = np.arange(len(element_perm))
            mapped = np.where(conn >= 0, node_perm[np.maximum(conn, 0)], -999)[inverse]
            if not np.array_equal(mapped, ref_conn):
                errors.append(f"{name}: connectivity differs")
            for key in ("mesh2d_node_x", "mesh2d_node_y"):
                if not np.array_equal(got[key][np.argsort(node_perm)], ref[key]):
                    errors.append(f"{name}: {key} differs")
            for key in ref:
                if ref[key].ndim == 2 and ref[key].shape == depth.shape:
                    if not np.array_equal(got[key][:, inverse], ref[key]):
                        errors.append(f"{name}: {key} differs")
        else:
            for key in ref:
                if not np.array_equal(got[key], ref[key]):
                    errors.append(f"{name}: {key} differs")
        for other in ("points.zrn0", "line.zrn1"):
            a = variables(f"{work}/ordered0/{other}")
            b = variables(f"{work}/{name}/{other}")
            for key in a:
                if not np.array_equal(a[key], b[key]):
                    errors.append(f"{name}: {other} {key} differs")
if errors:
    print("\n".join(errors))
    sys.exit(1)
PYCHECK
then
  fail "results depend on the numbering or the element order"
  cat "$WORK/compare.out"
fi

# ---- reported element numbers are the file's ---------------------------------

# check_reports DIR MESH: every "element number" block of the log names an
# element of the mesh file whose centre is the one reported beside it.
check_reports() {
  if ! "$PY" - "$1/setup.log" "$WORK/$2" > "$1/reports.out" 2>&1 <<'PYCHECK'
import re, sys
log, mesh = sys.argv[1], sys.argv[2]
with open(mesh) as f:
    rows = [line.split() for line in f]
nn = int(rows[0][2])
xy = {int(r[0]): (float(r[1]), float(r[2])) for r in rows[1:1 + nn]}
centre = {}
for r in rows[2 + nn:]:
    nodes = [int(n) for n in r[1:] if int(n) > 0]
    centre[int(r[0])] = (sum(xy[n][0] for n in nodes) / len(nodes), sum(xy[n][1] for n in nodes) / len(nodes))
text = open(log).read()
found = re.findall(r"element number\s*:\s*(\d+)\s*\n(?:.*\n)*?\s*x-coordinate \(center\)\s*:\s*(\S+)\s*\n\s*y-coordinate \(center\)\s*:\s*(\S+)", text)
if not found:
    print("no element reported")
    sys.exit(1)
for number, x, y in found:
    cx, cy = centre[int(number)]
    if abs(cx - float(x)) > 0.01 or abs(cy - float(y)) > 0.01:
        print(f"element {number} reported at ({x}, {y}), its centre is ({cx}, {cy})")
        sys.exit(1)
PYCHECK
  then
    fail "$1: reported element numbers are not the mesh file's"
    cat "$1/reports.out"
  fi
}

# The western level climbs to 400 m: the water passes the elevation limit.
for m in ordered shuffled; do
  run_case "blowup_$m" "$m.mesh" 1 30 400.0
  contains "$WORK/blowup_$m/setup.log" "BLOW-UP - Elevation too large"
  check_reports "$WORK/blowup_$m" "$m.mesh"
done
# A smallest step far above the CFL step: violations reported from step 1 on.
for m in ordered shuffled; do
  run_case "cfl_$m" "$m.mesh" 1 2 1.0 "dt_min_HD = 4.0"
  contains "$WORK/cfl_$m/setup.log" "CFL"
  check_reports "$WORK/cfl_$m" "$m.mesh"
done

[ "$FAILURES" -eq 0 ]
