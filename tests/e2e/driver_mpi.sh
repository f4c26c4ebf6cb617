# Two message-passing processes: each writes its own log, process 1's log is
# deleted at the end when delete_logfile = 1 and kept with 0, and both stop
# together when the host asks process 0 to stop. Skipped without mpirun.
. ./driver_common.inc
unset TANO_PROGRESS

if ! command -v mpirun > /dev/null 2>&1; then
  echo "mpirun not found: skipped"
  exit 0
fi
MPIRUN="mpirun --allow-run-as-root --oversubscribe -np 2"
export OMPI_MCA_mpi_yield_when_idle=1

d=$(case_dir delete)
write_setup "$d/setup.toml" 5
sed -i 's/^\[VantorHD\]$/[VantorHD]\ndelete_logfile = 1/' "$d/setup.toml"
$MPIRUN "$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1
status_is 0 $? "two processes"
contains "$d/setup.log" "Number of processes  : 2"
contains "$d/setup.log" "Local process id     : 0"
contains "$d/setup.log" "MPI Communication Timings"
contains "$d/setup.log" "  Normal run completion"
[ -e "$d/setup_p1.log" ] && fail "process 1's log was not deleted"

d=$(case_dir keep)
write_setup "$d/setup.toml" 5
sed -i 's/^\[VantorHD\]$/[VantorHD]\ndelete_logfile = 0/' "$d/setup.toml"
$MPIRUN "$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1
status_is 0 $? "two processes, logs kept"
contains "$d/setup_p1.log" "Local process id     : 1"
contains "$d/setup_p1.log" "  Normal run completion"
# Only process 0 reads the time axis; process 1 receives it.
lacks "$d/setup_p1.log" "Section: TIME"
[ -e "$d/setup_p1._spi_" ] && fail "process 1 wrote progress records"

# The kill file seen by process 0 stops both processes after the same step.
d=$(case_dir kill)
write_setup "$d/setup.toml" 2000000000
sed -i 's/^\[VantorHD\]$/[VantorHD]\ndelete_logfile = 0/' "$d/setup.toml"
$MPIRUN "$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1 &
pid=$!
i=0
while [ $i -lt 600 ] && ! grep -qF "COMSPD" "$d/setup._spi_" 2>/dev/null; do
  sleep 0.1
  i=$((i + 1))
done
touch "$d/setup._kill_"
wait $pid
status_is 0 $? "kill file with two processes"
contains "$d/setup.log" "  Run cancelled by user"
contains "$d/setup_p1.log" "  Run cancelled by user"

# A fatal error on process 0 alone (only it reads the time axis, process 1
# waits for it) ends both instead of leaving process 1 waiting.
d=$(case_dir fatal)
write_setup "$d/setup.toml" 5
sed -i 's/time_step_interval = 30.0/time_step_interval = -1.0/' "$d/setup.toml"
$MPIRUN "$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1
status=$?
[ $status -ne 0 ] || fail "a fatal error under mpirun gave exit status 0"
contains "$d/setup.log" "time_step_interval must be greater than 0"

finish
