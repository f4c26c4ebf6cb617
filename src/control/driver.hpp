#pragma once
// The program VantorHD: start-up, module setups, the time loop and the end of
// the run. Returns only through the process exit (status 0 after a completed
// or cancelled run; fatal errors and signals end the process on their own).

namespace vhd {

int RunVantorHD(int argc, char** argv);

}  // namespace vhd
