# A run on a "LONG/LAT" mesh: a channel at 55 N fed by a discharge boundary
# runs to its end; the log, the CFL reports and the result files give
# coordinates in degrees, and the area file carries the geographic CRS.
. ./driver_common.inc
export TANO_PROGRESS=NONE
PY=/usr/bin/python3

# A channel of 20 x 2 cells of 0.005 degrees of longitude (319 m) by 0.0045
# degrees of latitude (500 m), quadrilaterals in the west and triangles in
# the east, bed 2 m below datum; open in the west (code 2) and east (code 3).
write_channel() {
  "$PY" - "$1/channel.mesh" <<'PYMESH'
import sys
nx, ny, dx, dy = 20, 2, 0.005, 0.0045
def code(i, j):
    if i == 0 and 0 < j < ny: return 2
    if i == nx and 0 < j < ny: return 3
    return 1 if i in (0, nx) or j in (0, ny) else 0
nodes = [(j * (nx + 1) + i + 1, i, j) for j in range(ny + 1) for i in range(nx + 1)]
elements = []
for j in range(ny):
    for i in range(nx):
        a = j * (nx + 1) + i + 1
        b, c, e = a + 1, a + nx + 2, a + nx + 1
        if i < nx // 2:
            elements.append((a, b, c, e))
        else:
            elements += [(a, b, c, 0), (a, c, e, 0)]
with open(sys.argv[1], "w") as f:
    f.write(f"100079 1000 {len(nodes)} LONG/LAT\n")
    for k, i, j in nodes:
        f.write(f"{k} {9.0 + i * dx:.4f} {55.0 + j * dy:.4f} -2.0 {code(i, j)}\n")
    f.write(f"{len(elements)} 4 25\n")
    for k, el in enumerate(elements, 1):
        f.write(f"{k} {el[0]} {el[1]} {el[2]} {el[3]}\n")
PYMESH
}

d=$(case_dir geographic)
write_channel "$d"
cat > "$d/setup.toml" <<SETUP
[VantorHD]

[VantorHD.TIME]
start_time = [2004, 1, 1, 0, 0, 0]
time_step_interval = 30.0
number_of_time_steps = 40

[VantorHD.DOMAIN]
file_name = "channel.mesh"

[VantorHD.MODULE_SELECTION]
mode_of_hydrodynamic_module = 2

[VantorHD.HYDRODYNAMIC_MODULE]
mode = 2

[VantorHD.HYDRODYNAMIC_MODULE.SOLUTION_TECHNIQUE]
scheme_of_time_integration = 2
scheme_of_space_discretization_horizontal = 2
CFL_critical_HD = 0.5
dt_min_HD = 30.0

[VantorHD.HYDRODYNAMIC_MODULE.BED_RESISTANCE]
type = 4
[VantorHD.HYDRODYNAMIC_MODULE.BED_RESISTANCE.MANNING_NUMBER]
format = 0
constant_value = 30.0

[VantorHD.HYDRODYNAMIC_MODULE.INITIAL_CONDITIONS]
type = 1
surface_elevation_constant = 0.0

[VantorHD.HYDRODYNAMIC_MODULE.BOUNDARY_CONDITIONS.CODE_1]
type = 1

[VantorHD.HYDRODYNAMIC_MODULE.BOUNDARY_CONDITIONS.CODE_2]
type = 7
constant_value = 20.0
type_of_soft_start = 0

[VantorHD.HYDRODYNAMIC_MODULE.BOUNDARY_CONDITIONS.CODE_3]
type = 6
constant_value = 0.0

[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS]
number_of_outputs = 2

[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1]
file_name = "area.zrnu"
format = 2
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1.PARAMETERS_2D]
TOTAL_WATER_DEPTH = true
U_VELOCITY = true

[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2]
file_name = "points.zrn0"
format = 0
number_of_points = 1
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2.POINT_1]
name = "Middle"
x = 9.05
y = 55.004
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2.PARAMETERS_2D]
TOTAL_WATER_DEPTH = true
SETUP
"$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1
status_is 0 $? "geographic run"
[ "$(tail -n 1 "$d/setup.log")" = "  Normal run completion" ] || fail "geographic run: last log line $(tail -n 1 "$d/setup.log")"
contains "$d/setup.log" "Min x-coordinate (degree)"
contains "$d/setup.log" "CFL condition violated in HD calculation"
check_degrees() {
  "$PY" - "$@" > "$d/python.out" 2>&1 || { fail "result check"; cat "$d/python.out"; }
}
check_degrees "$d/setup.log" "$d/area.zrnu" "$d/points.zrn0" <<'PYCHECK'
import re, sys
import numpy as np
import netCDF4

log, area, points = sys.argv[1:4]
errors = []
def check(ok, what):
    if not ok:
        errors.append(what)

# Every CFL report names a centre in degrees inside the channel.
xs = [float(v) for v in re.findall(r"x-coordinate \(center\) : *(\S+)", open(log).read())]
ys = [float(v) for v in re.findall(r"y-coordinate \(center\) : *(\S+)", open(log).read())]
check(xs and all(9.0 < x < 9.1 for x in xs), f"report x in degrees: {xs[:3]}")
check(ys and all(55.0 < y < 55.009 for y in ys), f"report y in degrees: {ys[:3]}")

with netCDF4.Dataset(area) as nc:
    x, y = nc.variables["mesh2d_node_x"][:], nc.variables["mesh2d_node_y"][:]
    check(abs(x.min() - 9.0) < 1e-9 and abs(x.max() - 9.1) < 1e-9, f"node x in degrees {x.min()} {x.max()}")
    check(abs(y.min() - 55.0) < 1e-9 and abs(y.max() - 55.009) < 1e-9, f"node y in degrees {y.min()} {y.max()}")
    fx = nc.variables["mesh2d_face_x"][:]
    check(9.0 < fx.min() and fx.max() < 9.1, "face centres in degrees")
    check("crs" in nc.variables and int(nc.variables["crs"].epsg) == 4326, "crs EPSG:4326")
    h = nc.variables["total_water_depth"][:]
    u = nc.variables["u_velocity"][:]
    check(np.isfinite(h).all() and h.min() > 1.0 and h.max() < 4.0, f"depths {h.min()} .. {h.max()}")
    # 20 m3/s through a section 2 x 500 m wide and about 2 m deep: 0.01 m/s.
    mean_u = float(u[-1].mean())
    check(0.005 < mean_u < 0.02, f"mean eastward velocity {mean_u}")
with netCDF4.Dataset(points) as nc:
    check(nc.variables["time"].shape[0] == 41, "a point record at every step")
if errors:
    print("\n".join(errors))
    sys.exit(1)
PYCHECK
exit $FAILURES
