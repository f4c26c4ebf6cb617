# Sand transport in a run: a discharge boundary drives a current over a slope
# of triangles and quadrilaterals with a mound; the bed load (Meyer-Peter and
# Mueller, helical flow, morphological factor 200) moves the bed. The runs on
# 1 and 2 processes and on 2 threads give the same bits in every output
# (flow and sand), and the log holds the module's sections and statistics.
# A sand module without the flow is refused. The process comparison is
# skipped without mpirun.
. ./driver_common.inc
export TANO_PROGRESS=NONE
export OMPI_MCA_mpi_yield_when_idle=1
PY=/usr/bin/python3

. ./processes_common.inc

e=$(case_dir no_flow)
write_slope "$e" closed
sed -i 's/^mode_of_hydrodynamic_module = 2/mode_of_hydrodynamic_module = 0\nmode_of_sand_transport_module = 2/' \
  "$e/setup.toml"
timeout 600 "$VANTORHD" "$e/setup.toml" > "$e/out" 2>&1
status_is 1 $? "$e"
contains "$e/setup.log" "Fatal error: The Hydrodynnamic module must be included"

if ! command -v mpirun > /dev/null 2>&1; then
  echo "mpirun not found: skipped"
  finish
  exit 0
fi

d=$(case_dir sand)
write_slope "$d" open
sed -i 's/^mode_of_hydrodynamic_module = 2/mode_of_hydrodynamic_module = 2\nmode_of_sand_transport_module = 2/' \
  "$d/setup.toml"
cat >> "$d/setup.toml" <<'SETUP'

[VantorHD.HYDRODYNAMIC_MODULE.BOUNDARY_CONDITIONS.CODE_1]
type = 1

[VantorHD.HYDRODYNAMIC_MODULE.BOUNDARY_CONDITIONS.CODE_2]
type = 7
constant_value = 250.0
type_of_soft_start = 0

[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS]
number_of_outputs = 1

[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1]
file_name = "flow.zrnu"
format = 2
time_step_frequency = 10
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1.PARAMETERS_2D]
SURFACE_ELEVATION = true
U_VELOCITY = true
V_VELOCITY = true
STILL_WATER_DEPTH = true

[VantorHD.SAND_TRANSPORT_MODULE.SEDIMENT_DATA]
grain_diameter = 0.0002
porosity = 0.4

[VantorHD.SAND_TRANSPORT_MODULE.BED_LOAD]
bed_load_formula = 4

[VantorHD.SAND_TRANSPORT_MODULE.HELICAL_FLOW]
type = 1

[VantorHD.SAND_TRANSPORT_MODULE.MORPHOLOGY]
morphological_factor = 200.0
start_time = 300.0

[VantorHD.SAND_TRANSPORT_MODULE.OUTPUTS]
number_of_outputs = 2

[VantorHD.SAND_TRANSPORT_MODULE.OUTPUTS.OUTPUT_1]
file_name = "sand.zrnu"
format = 2
time_step_frequency = 10
[VantorHD.SAND_TRANSPORT_MODULE.OUTPUTS.OUTPUT_1.PARAMETERS_2D]
BED_LOAD_X = true
BED_LOAD_Y = true
BED_LOAD_MAGNITUDE = true
BED_LEVEL = true
BED_LEVEL_CHANGE = true

[VantorHD.SAND_TRANSPORT_MODULE.OUTPUTS.OUTPUT_2]
file_name = "sand_points.zrn0"
format = 0
number_of_points = 1
[VantorHD.SAND_TRANSPORT_MODULE.OUTPUTS.OUTPUT_2.POINT_1]
name = "mound"
x = 500720.0
y = 6000160.0
[VantorHD.SAND_TRANSPORT_MODULE.OUTPUTS.OUTPUT_2.PARAMETERS_2D]
BED_LEVEL_CHANGE = true
SETUP
run_case "$d" 1 1
contains "${d}_n1_t1/setup.log" "Section: BED_LOAD"
contains "${d}_n1_t1/setup.log" "Sand transport statistics"
# The bed moved: some bed level changed by more than a millimetre.
"$PY" - "${d}_n1_t1/sand.zrnu" <<'PY' || fail "the bed did not move"
import sys
import numpy as np
import netCDF4
with netCDF4.Dataset(sys.argv[1]) as f:
    change = np.ma.getdata(f.variables["bed_level_change"][:])
    load = np.ma.getdata(f.variables["bed_load_magnitude"][:])
sys.exit(0 if np.abs(change[-1]).max() > 1e-3 and load[-1].max() > 0 else 1)
PY
for layout in "2 1" "1 2"; do
  set -- $layout
  run_case "$d" "$1" "$2"
  same_results "${d}_n1_t1" "${d}_n$1_t$2"
done

finish
