# Rain, evaporation and point sources on 1 and 2 message-passing processes:
# a closed slope of quadrilaterals and triangles, wet in the west and dry in
# the east, with rain and evaporation, a source on the dry slope, a
# connected pair from the western water to the dry east (so across the
# sub-domains) and a jet across the middle. Both runs give the same result files (the source result file
# among them) and volume balance, and the balance books the exact volumes:
# precipitation r t A, evaporation e t A, source inflow Q t plus the volume
# moved by the pair, which the outflow matches. Skipped without mpirun.
. ./driver_common.inc
export TANO_PROGRESS=NONE
# Idle processes yield the core.
export OMPI_MCA_mpi_yield_when_idle=1
PY=/usr/bin/python3

if ! command -v mpirun > /dev/null 2>&1; then
  echo "mpirun not found: skipped"
  exit 0
fi
. ./processes_common.inc

d=$(case_dir sources)
"$PY" - "$d/slope.mesh" <<'PYMESH'
import sys
# 1200 m x 300 m of 50 m cells, quadrilaterals west of x = 600 m and
# triangles east of it; the bed rises from 2 m below datum to 2 m above it,
# with a mound; closed.
nx, ny, d = 24, 6, 50.0
def bed(x, y):
    mound = 1.5 if (x - 800.0) ** 2 + (y - 150.0) ** 2 < 100.0 ** 2 else 0.0
    return -2.0 + 4.0 * x / (nx * d) + mound
def code(i, j):
    return 1 if i in (0, nx) or j in (0, ny) else 0
nodes = [(j * (nx + 1) + i + 1, i * d, j * d) for j in range(ny + 1) for i in range(nx + 1)]
elements = []
for j in range(ny):
    for i in range(nx):
        a = j * (nx + 1) + i + 1
        b, c, e = a + 1, a + nx + 2, a + nx + 1
        elements += [(a, b, c, e)] if i < nx // 2 else [(a, b, c, 0), (a, c, e, 0)]
with open(sys.argv[1], "w") as f:
    f.write(f"100079 1000 {len(nodes)} UTM-32\n")
    for k, x, y in nodes:
        f.write(f"{k} {500000 + x:.1f} {6000000 + y:.1f} {bed(x, y):.3f} {code(round(x / d), round(y / d))}\n")
    f.write(f"{len(elements)} 4 25\n")
    for k, el in enumerate(elements, 1):
        f.write(f"{k} {' '.join(map(str, el))}\n")
PYMESH
cat > "$d/setup.toml" <<'SETUP'
[VantorHD]

[VantorHD.TIME]
start_time = [2004, 1, 1, 0, 0, 0]
time_step_interval = 30.0
number_of_time_steps = 40

[VantorHD.DOMAIN]
file_name = "slope.mesh"

[VantorHD.MODULE_SELECTION]
mode_of_hydrodynamic_module = 2

[VantorHD.HYDRODYNAMIC_MODULE]
mode = 2

[VantorHD.HYDRODYNAMIC_MODULE.SOLUTION_TECHNIQUE]
scheme_of_time_integration = 2
scheme_of_space_discretization_horizontal = 2

[VantorHD.HYDRODYNAMIC_MODULE.FLOOD_AND_DRY]
type = 2

[VantorHD.HYDRODYNAMIC_MODULE.BED_RESISTANCE]
type = 4
[VantorHD.HYDRODYNAMIC_MODULE.BED_RESISTANCE.MANNING_NUMBER]
format = 0
constant_value = 32.0

[VantorHD.HYDRODYNAMIC_MODULE.INITIAL_CONDITIONS]
type = 1
surface_elevation_constant = -1.0

[VantorHD.HYDRODYNAMIC_MODULE.PRECIPITATION_EVAPORATION]
type_of_precipitation = 1
type_of_evaporation = 1
[VantorHD.HYDRODYNAMIC_MODULE.PRECIPITATION_EVAPORATION.PRECIPITATION]
format = 0
constant_value = 2400.0
[VantorHD.HYDRODYNAMIC_MODULE.PRECIPITATION_EVAPORATION.EVAPORATION]
format = 0
constant_value = 240.0

[VantorHD.HYDRODYNAMIC_MODULE.SOURCES]
number_of_sources = 4
output_type = 1
[VantorHD.HYDRODYNAMIC_MODULE.SOURCES.SOURCE_1]
type = 1
coordinates = [501037.5, 6000112.5]
format = 0
constant_value = 10.0
[VantorHD.HYDRODYNAMIC_MODULE.SOURCES.SOURCE_2]
type = 3
connected_source = 3
coordinates = [500125.0, 6000125.0]
format = 0
constant_values = [3.0, 0.0, 0.0]
[VantorHD.HYDRODYNAMIC_MODULE.SOURCES.SOURCE_3]
type = 5
coordinates = [500837.5, 6000262.5]
[VantorHD.HYDRODYNAMIC_MODULE.SOURCES.SOURCE_4]
type = 4
interpolation_type = 2
coordinates = [500075.0, 6000175.0]
sigma = 90.0
diameter = 0.3
maximum_distance = 200.0
format = 0
constant_values = [1.0, 0.0, 0.0]

[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS]
number_of_outputs = 1

[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1]
file_name = "area.zrnu"
format = 2
time_step_frequency = 10
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1.PARAMETERS_2D]
SURFACE_ELEVATION = true
TOTAL_WATER_DEPTH = true
U_VELOCITY = true
WET_DRY_CODE = true
SETUP
run_case "$d" 1 1
run_case "$d" 2 1
same_results "${d}_n1_t1" "${d}_n2_t1"
[ -f "${d}_n1_t1/source_data.zrn0" ] || fail "no source result file"

# The balance: rain 100 mm/h and evaporation 10 mm/h over 360000 m2 for
# 1200 s wherever there is water to evaporate (the dry east has none at the
# start), 10 m3/s from source 1, 1 m3/s from the jet and 3 m3/s moved by
# the pair.
value() { sed -n "s/^ *$2 (m\*\*3) *: *//p" "$1/setup.log"; }
r="${d}_n2_t1"
"$PY" - "$(value "$r" Precipitation)" "$(value "$r" Evaporation)" "$(value "$r" "Source inflow")" \
  "$(value "$r" "Source outflow")" "$(value "$r" "Continuity balance")" "$(value "$r" "Final volume in model area")" <<'PY' ||
import sys
p, e, qin, qout, cont, final = map(float, sys.argv[1:])
bad = []
if abs(p - 12000.0) > 1e-6: bad.append(f"precipitation {p}, expected 12000")
if not -1200.0 <= e < 0.0: bad.append(f"evaporation {e}, expected in [-1200, 0)")
if abs(qin - 16800.0) > 1e-6: bad.append(f"source inflow {qin}, expected 12000 + 3600 + 1200")
if abs(qout + 3600.0) > 1e-6: bad.append(f"source outflow {qout}, expected -3600")
if abs(cont) > 1e-9 * final: bad.append(f"continuity balance {cont} of {final}")
print("\n".join(bad))
sys.exit(1 if bad else 0)
PY
  fail "$r: volume balance"
contains "$r/setup.log" "number_of_sources : 4"
contains "$r/setup.log" "Source information"

finish
