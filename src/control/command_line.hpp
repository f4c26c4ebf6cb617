#pragma once
// The command line: the program path, the setup file and the options.
//
//   vantorhd setup.toml [-gpu n d1 .. dn] [//anything]
//
// Arguments beginning with "//" are invisible (they let a host annotate the
// command); only the first 100 arguments after the program path are looked at.

#include <string>
#include <vector>

namespace vhd {

struct CommandLine {
  std::string program;           // argument 0, trimmed
  std::string setup_file;        // empty when not given
  std::vector<int> gpu_devices;  // from "-gpu n d1 .. dn"
  std::string error;             // non-empty: the message to stop with
};

CommandLine ScanCommandLine(int argc, const char* const* argv);

}  // namespace vhd
