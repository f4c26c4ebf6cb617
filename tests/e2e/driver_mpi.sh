# Two message-passing processes: until the mesh is split over processes, such
# a run stops at start on every process with a fatal error that says so (no
# multiplied sums, no hang), and each process keeps its log. Skipped without
# mpirun.
. ./driver_common.inc
unset TANO_PROGRESS

if ! command -v mpirun > /dev/null 2>&1; then
  echo "mpirun not found: skipped"
  exit 0
fi
MPIRUN="mpirun --allow-run-as-root --oversubscribe -np 2"

d=$(case_dir refused)
write_setup "$d/setup.toml" 5
timeout 120 $MPIRUN "$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1
status=$?
[ $status -ne 0 ] || fail "two processes gave exit status 0"
[ $status -ne 124 ] || fail "two processes hung"
contains "$d/setup.log" "Number of processes  : 2"
contains "$d/setup.log" "Fatal error: RunVantorHD: Runs on several processes (2) are"
lacks "$d/setup.log" "Normal run completion"

finish
