# Bad command lines and bad setup files: each ends with its message and
# exit status 1, never a crash.
. ./driver_common.inc
export TANO_PROGRESS=NONE

# No setup file: usage text and status 1 ("//" arguments do not count).
d=$(case_dir usage)
"$VANTORHD" //note > "$d/out" 2>&1
status_is 1 $? "no argument"
contains "$d/out" "Usage: $VANTORHD skt-file"

# A setup file that does not exist.
d=$(case_dir missing)
"$VANTORHD" "$d/nothere.toml" > "$d/out" 2>&1
status_is 1 $? "missing file"
contains "$d/out" "$VANTORHD: Unable to open $d/nothere.toml"

# A TOML syntax error: the message names line and column.
d=$(case_dir syntax)
printf '[VantorHD]\n\n[VantorHD.TIME\nnumber_of_time_steps = 3\n' > "$d/setup.toml"
"$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1
status_is 1 $? "syntax error"
contains_joined "$d/out" "near line 3 and colum 15 in file $d/setup.toml"

# The target is missing.
d=$(case_dir target)
printf '[Other]\nkey = 1\n' > "$d/setup.toml"
"$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1
status_is 1 $? "missing target"
contains "$d/setup.log" "SKT target: VantorHD not found"

# MaxIOHandles outside 512 .. 2048.
d=$(case_dir maxio)
write_setup "$d/setup.toml" 3
printf '[VantorHD.SYSTEM]\nMaxIOHandles = 100\n' >> "$d/setup.toml"
"$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1
status_is 1 $? "MaxIOHandles 100"
contains "$d/setup.log" "Fatal error: MaxIOHandles must be between 512 - 2048 !"
contains "$d/setup.log" "Abnormal completion"

# MaxIOHandles inside the range is taken.
d=$(case_dir maxio_ok)
write_setup "$d/setup.toml" 1
printf '[VantorHD.SYSTEM]\nMaxIOHandles = 1024\n' >> "$d/setup.toml"
"$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1
status_is 0 $? "MaxIOHandles 1024"
contains "$d/setup.log" "MaxIOHandles : 1024"

# The hydrodynamic module switched off.
d=$(case_dir hd0)
write_setup "$d/setup.toml" 3
sed -i 's/mode_of_hydrodynamic_module = 2/mode_of_hydrodynamic_module = 0/' "$d/setup.toml"
"$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1
status_is 1 $? "HD mode 0"
contains "$d/setup.log" "Fatal error: The Hydrodynnamic module must be included"

# A module this build does not have is refused by name.
d=$(case_dir notbuilt)
write_setup "$d/setup.toml" 3
printf 'mode_of_vitrax_module = 1\n' >> "$d/setup.toml"
"$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1
status_is 1 $? "module not in the build"
contains_joined "$d/setup.log" "mode_of_vitrax_module = 1: the ecological module is not available in this build"

# A time axis that cannot be run.
d=$(case_dir timeaxis)
write_setup "$d/setup.toml" 3
sed -i 's/time_step_interval = 30.0/time_step_interval = 0.0/' "$d/setup.toml"
"$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1
status_is 1 $? "time step 0"
contains "$d/setup.log" "time_step_interval must be greater than 0"

# A malformed -gpu option.
d=$(case_dir gpu)
write_setup "$d/setup.toml" 1
"$VANTORHD" "$d/setup.toml" -gpu 2 0 > "$d/out" 2>&1
status_is 1 $? "-gpu with too few devices"
contains "$d/out" "-gpu"

# A misspelled keyword in a section that was read is warned about by name
# and line; the run itself goes on.
d=$(case_dir misspelt)
write_setup "$d/setup.toml" 2
sed -i 's/time_step_interval = 30.0/time_step_intervall = 10.0/' "$d/setup.toml"
"$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1
status_is 0 $? "misspelt keyword"
contains "$d/setup.log" "time_step_intervall"
contains "$d/setup.log" "line 5"
contains "$d/setup.log" "time_step_interval : 30 (default)"
contains "$d/setup.log" "  Normal run completion"

# A misspelt section does not pass in silence: the run goes on with a
# warning that names it, its line and the section it was probably meant as.
d=$(case_dir misspelt)
write_setup "$d/setup.toml" 1
printf '[VantorHD.HYDRODYNAMIC_MODULE.BED_RESISTENCE]\ntype = 4\n' >> "$d/setup.toml"
"$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1
status_is 0 $? "misspelt section"
contains_joined "$d/setup.log" "Warning: Section BED_RESISTENCE in section VantorHD/HYDRODYNAMIC_MODULE, line 16: not used; did you mean BED_RESISTANCE?"

# A feature this build does not have stops the run when it is switched on.
d=$(case_dir infiltration)
write_setup "$d/setup.toml" 1
printf '[VantorHD.HYDRODYNAMIC_MODULE.INFILTRATION]\ntype = 1\n' >> "$d/setup.toml"
"$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1
status_is 1 $? "infiltration"
contains_joined "$d/setup.log" "Infiltration is not available in this build"

finish
