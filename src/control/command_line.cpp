#include "control/command_line.hpp"

#include <algorithm>
#include <charconv>
#include <string_view>

namespace vhd {

namespace {

constexpr int kMaxArguments = 100;

std::string Trim(std::string_view s) {
  const auto first = s.find_first_not_of(" \t\r\n");
  if (first == std::string_view::npos) return {};
  const auto last = s.find_last_not_of(" \t\r\n");
  return std::string(s.substr(first, last - first + 1));
}

bool ParseInt(const std::string& s, int& value) {
  const char* end = s.data() + s.size();
  const auto [p, ec] = std::from_chars(s.data(), end, value);
  return ec == std::errc() && p == end;
}

}  // namespace

CommandLine ScanCommandLine(int argc, const char* const* argv) {
  CommandLine cl;
  cl.program = argc > 0 && argv[0] ? Trim(argv[0]) : std::string("vantorhd");

  std::vector<std::string> args;
  const int last = std::min(argc - 1, kMaxArguments);
  for (int i = 1; i <= last; ++i) {
    const std::string_view a = argv[i] ? argv[i] : "";
    if (!a.starts_with("//")) args.emplace_back(a);
  }
  if (args.empty()) {
    cl.error = "Usage: " + cl.program + " skt-file";
    return cl;
  }
  cl.setup_file = args[0];

  for (std::size_t i = 1; i < args.size(); ++i) {
    if (args[i] != "-gpu") continue;
    int n = 0;
    if (i + 1 >= args.size() || !ParseInt(args[i + 1], n) || n < 0) {
      cl.error = "-gpu: the number of devices must follow as an integer >= 0";
      return cl;
    }
    if (i + 1 + static_cast<std::size_t>(n) >= args.size()) {
      cl.error = "-gpu: " + std::to_string(n) + " device numbers expected";
      return cl;
    }
    cl.gpu_devices.clear();
    for (int k = 1; k <= n; ++k) {
      int device = 0;
      if (!ParseInt(args[i + 1 + k], device)) {
        cl.error = "-gpu: device number expected, found \"" + args[i + 1 + k] + "\"";
        return cl;
      }
      cl.gpu_devices.push_back(device);
    }
    i += 1 + static_cast<std::size_t>(n);
  }
  return cl;
}

}  // namespace vhd
