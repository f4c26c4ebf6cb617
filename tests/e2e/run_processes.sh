# Runs on 1, 2 and 4 message-passing processes (and 2 processes of 2
# threads) give the same results: every value of every output file, the
# volume balance and the mass budget over a polygon that crosses the
# sub-domains. Two cases: the bundled tidal example (flooding and drying of a
# flat) and a flood from a discharge boundary onto a dry slope of triangles
# and quadrilaterals, second order, which must also take in the prescribed
# volume in full; then the slope under wind, pressure and Coriolis, and
# under ice over a time-varying depth correction. Skipped without mpirun.
. ./driver_common.inc
export TANO_PROGRESS=NONE
# Idle processes yield the core, so that 4 processes on 2 busy cores do not
# spin against each other.
export OMPI_MCA_mpi_yield_when_idle=1
PY=/usr/bin/python3

if ! command -v mpirun > /dev/null 2>&1; then
  echo "mpirun not found: skipped"
  exit 0
fi
EXAMPLE=$(cd ../../examples/default && pwd)

. ./processes_common.inc

# ---- the bundled example -----------------------------------------------------

d=$(case_dir tide)
cp "$EXAMPLE/setup.toml" "$EXAMPLE/flat.mesh" "$EXAMPLE/tide.zrn0" "$d/"
sed -i 's/^number_of_time_steps = .*/number_of_time_steps = 30/' "$d/setup.toml"
run_case "$d" 1 2
for layout in "2 1" "4 1" "2 2"; do
  set -- $layout
  run_case "$d" "$1" "$2"
  same_results "${d}_n1_t2" "${d}_n$1_t$2"
done
contains "${d}_n2_t1/setup.log" "Number of partitions: 2"
contains "${d}_n4_t1/setup.log" " External layer"

# ---- a flood onto a dry slope ------------------------------------------------

d=$(case_dir slope)
write_slope "$d" open
cat >> "$d/setup.toml" <<'SETUP'

[VantorHD.HYDRODYNAMIC_MODULE.BOUNDARY_CONDITIONS.CODE_1]
type = 1

[VantorHD.HYDRODYNAMIC_MODULE.BOUNDARY_CONDITIONS.CODE_2]
type = 7
constant_value = 25.0
type_of_soft_start = 0

[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS]
number_of_outputs = 3

[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1]
file_name = "area.zrnu"
format = 2
time_step_frequency = 10
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1.PARAMETERS_2D]
SURFACE_ELEVATION = true
TOTAL_WATER_DEPTH = true
U_VELOCITY = true
V_VELOCITY = true
WET_DRY_CODE = true
MAXIMUM_CURRENT_SPEED = true

[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2]
file_name = "budget.zrn0"
type = 3
format = 0
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2.MASSBUDGET]
number_of_points = 4
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2.MASSBUDGET.POINT_1]
x = 500320.0
y = 5999900.0
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2.MASSBUDGET.POINT_2]
x = 500910.0
y = 5999900.0
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2.MASSBUDGET.POINT_3]
x = 500910.0
y = 6000180.0
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2.MASSBUDGET.POINT_4]
x = 500320.0
y = 6000180.0

[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_3]
file_name = "section.zrn0"
type = 4
format = 1
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_3.LINE]
x_first = 500420.0
y_first = 5999990.0
x_last = 500420.0
y_last = 6000310.0
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_3.DISCHARGE]
DISCHARGE = true
ACCUMULATED_DISCHARGE = true
SETUP
run_case "$d" 1 1
for layout in "2 1" "4 1"; do
  set -- $layout
  run_case "$d" "$1" "$2"
  same_results "${d}_n1_t1" "${d}_n$1_t$2"
done
# The discharge boundary takes in 25 m3/s x 1200 s in full on every layout.
for r in "${d}_n1_t1" "${d}_n4_t1"; do
  inflow=$(sed -n 's/^ *Total volume from boundaries (m\*\*3) *: *//p' "$r/setup.log")
  "$PY" -c "import sys; v = float('$inflow'); sys.exit(0 if abs(v - 30000.0) <= 300.0 else 1)" ||
    fail "$r: boundary volume $inflow, expected 30000 m3 within 1 %"
done

# ---- wind, air pressure and Coriolis over the slope ------------------------------

# The map of wind and air pressure comes from a first run of the slope case
# on one process: its surface elevation (x 100 Pa), total depth and v
# velocity at every step, read as pressure (hPa), x and y wind (m/s).
m=$(case_dir storm_map)
cp "$d/slope.mesh" "$m/"
sed -e 's/^number_of_outputs = 3/number_of_outputs = 1/' -e 's/^time_step_frequency = 10/time_step_frequency = 1/' \
  -e '/^MAXIMUM_CURRENT_SPEED/d' -e '/^U_VELOCITY/d' -e '/^WET_DRY_CODE/d' "$d/setup.toml" > "$m/setup.toml"
OMP_NUM_THREADS=1 timeout 600 "$VANTORHD" "$m/setup.toml" > "$m/out" 2>&1
status_is 0 $? "$m"
s=$(case_dir storm)
cp "$d/slope.mesh" "$s/"
cp "$m/area.zrnu" "$s/map.zrnu"
sed -n '1,/^\[VantorHD.HYDRODYNAMIC_MODULE.BOUNDARY_CONDITIONS.CODE_1\]/p' "$d/setup.toml" | sed '$d' > "$s/setup.toml"
cat >> "$s/setup.toml" <<'SETUP'
[VantorHD.HYDRODYNAMIC_MODULE.CORIOLIS]
type = 2

[VantorHD.HYDRODYNAMIC_MODULE.WIND_FORCING]
type = 1
format = 3
file_name = "map.zrnu"
item_number_for_pressure = 1
item_number_for_x_velocity = 2
item_number_for_y_velocity = 3
soft_time_interval = 300.0

SETUP
sed -n '/^\[VantorHD.HYDRODYNAMIC_MODULE.BOUNDARY_CONDITIONS.CODE_1\]/,$p' "$d/setup.toml" >> "$s/setup.toml"
run_case "$s" 1 1
run_case "$s" 2 1
same_results "${s}_n1_t1" "${s}_n2_t1"
contains "${s}_n1_t1/setup.log" "Section: WIND_FORCING"

# The storm under ice over a moving bed: the depth correction, the ice
# thickness and the ice concentration (sheltering the wind in part, between
# 0 and 2) all from the map's total depth, with an ice roughness.
i=$(case_dir storm_ice)
cp "$s/slope.mesh" "$s/map.zrnu" "$i/"
sed -n '1,/^\[VantorHD.HYDRODYNAMIC_MODULE.BOUNDARY_CONDITIONS.CODE_1\]/p' "$s/setup.toml" | sed '$d' > "$i/setup.toml"
cat >> "$i/setup.toml" <<'SETUP'
[VantorHD.HYDRODYNAMIC_MODULE.DEPTH]
type = 1
format = 3
file_name = "map.zrnu"
item_number = 2

[VantorHD.HYDRODYNAMIC_MODULE.ICE]
type = 3
c_cut_off_lower = 0.0
c_cut_off = 2.0
format = 3
file_name = "map.zrnu"
item_number_concentration = 2
item_number_thickness = 2

[VantorHD.HYDRODYNAMIC_MODULE.ICE.ROUGHNESS]
constant_value = 0.05

SETUP
sed -n '/^\[VantorHD.HYDRODYNAMIC_MODULE.BOUNDARY_CONDITIONS.CODE_1\]/,$p' "$s/setup.toml" >> "$i/setup.toml"
run_case "$i" 1 1
run_case "$i" 2 1
same_results "${i}_n1_t1" "${i}_n2_t1"
contains "${i}_n1_t1/setup.log" "Section: ICE"
contains "${i}_n1_t1/setup.log" "Section: DEPTH"

finish
