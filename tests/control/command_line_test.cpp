#include "control/command_line.hpp"

#include <gtest/gtest.h>

#include <vector>

namespace vhd {
namespace {

CommandLine Scan(std::vector<const char*> args) {
  return ScanCommandLine(static_cast<int>(args.size()), args.data());
}

TEST(CommandLine, SetupFileIsTheFirstVisibleArgument) {
  const CommandLine cl = Scan({"  /opt/bin/vantorhd ", "//note", "model.toml", "//x"});
  EXPECT_EQ(cl.program, "/opt/bin/vantorhd");
  EXPECT_EQ(cl.setup_file, "model.toml");
  EXPECT_TRUE(cl.error.empty());
  EXPECT_TRUE(cl.gpu_devices.empty());
}

TEST(CommandLine, WithoutSetupFileGivesUsage) {
  EXPECT_EQ(Scan({"vantorhd"}).error, "Usage: vantorhd skt-file");
  // Arguments beginning with two slashes do not count.
  EXPECT_EQ(Scan({"./vantorhd", "//a", "//b"}).error, "Usage: ./vantorhd skt-file");
  // One slash is an ordinary argument.
  EXPECT_EQ(Scan({"vantorhd", "/data/a.toml"}).setup_file, "/data/a.toml");
}

TEST(CommandLine, GpuOptionConsumesItsDeviceList) {
  const CommandLine cl = Scan({"vantorhd", "m.toml", "-gpu", "2", "0", "1", "other"});
  EXPECT_TRUE(cl.error.empty());
  EXPECT_EQ(cl.gpu_devices, (std::vector<int>{0, 1}));

  // Hidden arguments between the numbers are skipped too.
  const CommandLine hidden = Scan({"vantorhd", "m.toml", "-gpu", "//c", "1", "3"});
  EXPECT_EQ(hidden.gpu_devices, (std::vector<int>{3}));

  // The device numbers are not taken for the setup file or another option.
  const CommandLine zero = Scan({"vantorhd", "m.toml", "-gpu", "0"});
  EXPECT_TRUE(zero.error.empty());
  EXPECT_TRUE(zero.gpu_devices.empty());
}

TEST(CommandLine, MalformedGpuOptionIsAnError) {
  EXPECT_FALSE(Scan({"vantorhd", "m.toml", "-gpu"}).error.empty());
  EXPECT_FALSE(Scan({"vantorhd", "m.toml", "-gpu", "two", "0", "1"}).error.empty());
  EXPECT_FALSE(Scan({"vantorhd", "m.toml", "-gpu", "2", "0"}).error.empty());
  EXPECT_FALSE(Scan({"vantorhd", "m.toml", "-gpu", "1", "x"}).error.empty());
  EXPECT_FALSE(Scan({"vantorhd", "m.toml", "-gpu", "-1"}).error.empty());
}

TEST(CommandLine, OnlyTheFirstHundredArgumentsAreScanned) {
  std::vector<const char*> args{"vantorhd"};
  for (int i = 0; i < 100; ++i) args.push_back("//pad");
  args.push_back("late.toml");
  EXPECT_FALSE(Scan(args).error.empty());
  args.erase(args.begin() + 1);
  EXPECT_EQ(Scan(args).setup_file, "late.toml");
}

}  // namespace
}  // namespace vhd
