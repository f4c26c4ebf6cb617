// The setup-file layer: sections, typed readers, defaults, the log of every
// read, read errors and unused keywords.

#include <gtest/gtest.h>

#include <cstdlib>
#include <string>
#include <vector>

#include "io/setup.hpp"
#include "log/log.hpp"
#include "test_support.hpp"

namespace vhd {
namespace {

// A message as one text: its first line and the continuation lines that
// follow it, each without its indent.
std::string Unwrap(const std::vector<std::string>& lines, std::size_t first, std::size_t indent) {
  std::string text = lines.at(first);
  const std::string blanks(indent, ' ');
  for (std::size_t k = first + 1; k < lines.size() && lines[k].size() > indent && lines[k].rfind(blanks, 0) == 0; ++k) {
    text += lines[k].substr(indent);
  }
  return text;
}

const char* kSetup = R"([VantorHD]
delete_logfile = 1

[VantorHD.TIME]
start_time = [2004, 1, 1, 0, 0, 0]
time_step_interval = 30
number_of_time_steps = 120
CFL_critical = 0.8
use_flag = true
use_code = 2
title = "Basin test"

[VantorHD.DOMAIN]
file_name = "meshes/basin.mesh"
absolute_file = "/data/tide.zrn0"

[VantorHD.HYDRO.BOUNDARY_CONDITIONS.CODE_2]
type = 6
[VantorHD.HYDRO.BOUNDARY_CONDITIONS.CODE_M2]
type = 7

[[VantorHD.HYDRO.SOURCES.SOURCE]]
name = "river"
[[VantorHD.HYDRO.SOURCES.SOURCE]]
name = "outfall"
point = [[1.0, 2.0], [3.0, 4.0]]
)";

// A setup file in a fresh folder, opened with its log; Body() gives the log
// lines after the two header lines.
class SetupTest : public ::testing::Test {
protected:
  void Open(const std::string& text) {
    test::WriteTextFile(setup_path, text);
    SktOpenFile(setup_path, true);
  }
  void SetUp() override {
    unsetenv("VX7F90_LOG_NOPATH");
    unsetenv("BUILDMODE");
  }
  void TearDown() override {
    SktClose();
    CloseLogFile();
  }
  std::vector<std::string> Body() { return test::LogBody(log_path); }
  test::TempDir dir;
  std::string setup_path = dir.file("model.toml");
  std::string log_path = dir.file("model.log");
};

TEST_F(SetupTest, OpenCreatesTheLogAndKnowsItsFolder) {
  Open(kSetup);
  EXPECT_TRUE(SktIsOpen());
  EXPECT_TRUE(LogIsOpen());
  EXPECT_EQ(LogFilePath(), log_path);
  EXPECT_EQ(SktFolder(), dir.path().string() + "/");
  EXPECT_EQ(SktResolvePath("a/../b.mesh"), dir.file("b.mesh"));
  EXPECT_EQ(SktResolvePath("/abs/c.mesh"), "/abs/c.mesh");
}

TEST_F(SetupTest, TypedReadsAreLogged) {
  Open(kSetup);
  SktOpenTarget("VantorHD");
  SktOpenSection("TIME");
  std::vector<int> start;
  double dt = 0, cfl = 0;
  float cfl_single = 0;
  int steps = 0;
  bool flag_bool = false, code_bool = false, missing_bool = true;
  std::string title;
  SktReadKeyword("start_time", start, 6);
  SktReadKeyword("time_step_interval", dt);  // an integer is a valid real
  SktReadKeyword("number_of_time_steps", steps, 10);
  SktReadKeyword("CFL_critical", cfl);
  SktReadKeyword("CFL_critical", cfl_single);
  SktReadKeyword("use_flag", flag_bool);
  SktReadKeyword("use_code", code_bool);
  SktReadKeyword("use_missing", missing_bool, false);
  SktReadKeyword("title", title);
  int absent = -5;
  int flag = 0;
  SktReadKeyword("absent_no_default", absent, std::nullopt, {.flag = &flag});
  std::vector<double> weights;
  SktReadKeyword("weights", weights, 3, std::vector<double>{0.5, 0.25, 1e-7});
  SktCloseSection();
  EXPECT_EQ(start, (std::vector<int>{2004, 1, 1, 0, 0, 0}));
  EXPECT_EQ(dt, 30.0);
  EXPECT_EQ(steps, 120);
  EXPECT_EQ(cfl, 0.8);
  EXPECT_EQ(cfl_single, 0.8f);
  EXPECT_TRUE(flag_bool);
  EXPECT_TRUE(code_bool);
  EXPECT_FALSE(missing_bool);
  EXPECT_EQ(title, "Basin test");
  EXPECT_EQ(absent, -5);
  EXPECT_EQ(flag, 1);
  EXPECT_EQ(weights, (std::vector<double>{0.5, 0.25, 1e-7}));
  const std::string section = "  Section: TIME ";
  EXPECT_EQ(Body(), (std::vector<std::string>{
                        "",
                        section + std::string(70 - section.size(), '-'),
                        "    start_time : 2004 1 1 0 0 0",
                        "    time_step_interval : 30",
                        "    number_of_time_steps : 120",
                        "    CFL_critical : 0.8",
                        "    CFL_critical : 0.8",
                        "    use_flag : True",
                        "    use_code : True",
                        "    use_missing : False (default)",
                        "    title : Basin test",
                        "    weights : 0.5 0.25 1.E-07 (default)",
                    }));
}

TEST_F(SetupTest, FlagReportsFoundAndAbsent) {
  Open(kSetup);
  SktOpenTarget("VantorHD");
  SktOpenSection("TIME", kNoIndex, nullptr, false);
  int flag = -1;
  int steps = 0;
  SktReadKeyword("number_of_time_steps", steps, 1, {.flag = &flag});
  EXPECT_EQ(flag, 0);
  SktReadKeyword("number_of_time_step", steps, 1, {.flag = &flag});
  EXPECT_EQ(flag, 1);
  EXPECT_EQ(steps, 1);
  int second = 0;
  SktReadKeyword("start_time", second, {}, {.param = 2, .flag = &flag});
  EXPECT_EQ(second, 1);
  EXPECT_EQ(flag, 0);
  // A missing parameter or instance of a present keyword is a read error.
  SktReadKeyword("start_time", second, 4, {.param = 7, .flag = &flag});
  EXPECT_EQ(flag, 1);
  EXPECT_EQ(second, 4);
  flag = 0;
  SktReadKeyword("start_time", second, 4, {.instance = 2, .flag = &flag});
  EXPECT_EQ(flag, 1);
  EXPECT_EQ(SktNumberOfParams("start_time"), 6);
  EXPECT_EQ(SktNumberOfParams("title"), 1);
  EXPECT_EQ(SktNumberOfParams("nothing"), 0);
  EXPECT_TRUE(SktHasKeyword("title"));
  EXPECT_FALSE(SktHasKeyword("Title"));  // keys are matched exactly
}

TEST_F(SetupTest, FileNamesAreResolvedAndLoggedWholeOrWithoutPath) {
  Open(kSetup);
  SktOpenTarget("VantorHD");
  SktOpenSection("DOMAIN", kNoIndex, nullptr, false);
  std::string mesh, tide, initial;
  SktReadFileName("file_name", mesh);
  SktReadFileName("absolute_file", tide);
  setenv("VX7F90_LOG_NOPATH", "1", 1);
  SktReadFileName("file_name", mesh);
  SktReadFileName("initial_file", initial, std::string("init/start.zrnu"));
  EXPECT_EQ(mesh, dir.file("meshes/basin.mesh"));
  EXPECT_EQ(tide, "/data/tide.zrn0");
  EXPECT_EQ(initial, dir.file("init/start.zrnu"));
  EXPECT_EQ(Body(), (std::vector<std::string>{
                        "    file_name : " + dir.file("meshes/basin.mesh"),
                        "    absolute_file : /data/tide.zrn0",
                        "    file_name : basin.mesh",
                        "    initial_file : start.zrnu (default)",
                    }));
}

TEST_F(SetupTest, NumberedSectionsAndLevels) {
  Open(kSetup);
  SktOpenTarget("VantorHD");
  EXPECT_EQ(SktLevel(), 0);
  SktOpenSection("HYDRO");
  SktOpenSection("BOUNDARY_CONDITIONS");
  EXPECT_TRUE(SktSectionExists("CODE", 2));
  EXPECT_TRUE(SktSectionExists("CODE", -2));
  EXPECT_FALSE(SktSectionExists("CODE", 1));
  int type = 0;
  SktOpenSection("CODE", 2);
  EXPECT_EQ(SktLevel(), 3);
  EXPECT_EQ(SktSectionPath(), "VantorHD/HYDRO/BOUNDARY_CONDITIONS/CODE_2");
  SktReadKeyword("type", type);
  EXPECT_EQ(type, 6);
  SktCloseSection();
  SktOpenSection("CODE", -2);
  SktReadKeyword("type", type);
  EXPECT_EQ(type, 7);
  SktCloseSection();
  int status = 0;
  SktOpenSection("CODE", 3, &status);
  EXPECT_EQ(status, -1);
  EXPECT_EQ(SktSectionPath(), "VantorHD/HYDRO/BOUNDARY_CONDITIONS");
  const std::vector<std::string> body = Body();
  ASSERT_EQ(body.size(), 10u);
  const std::string code = "      Section: CODE_2 ";
  EXPECT_EQ(body[5], code + std::string(70 - code.size(), '-'));
  EXPECT_EQ(body[6], "        type : 6");
  EXPECT_EQ(body[8].substr(0, 23), "      Section: CODE_M2 ");
}

TEST_F(SetupTest, SectionInstancesAndKeywordInstances) {
  Open(kSetup);
  SktOpenTarget("VantorHD");
  SktOpenSection("HYDRO", kNoIndex, nullptr, false);
  SktOpenSection("SOURCES", kNoIndex, nullptr, false);
  EXPECT_EQ(SktNumberOfSectionInstances("SOURCE"), 2);
  std::string name;
  SktOpenSection("SOURCE", kNoIndex, nullptr, false, 2);
  SktReadKeyword("name", name);
  EXPECT_EQ(name, "outfall");
  EXPECT_EQ(SktNumberOfParams("point", 2), 2);
  std::vector<double> point;
  SktReadKeyword("point", point, 2, {}, {.instance = 2});
  EXPECT_EQ(point, (std::vector<double>{3.0, 4.0}));
  double x = 0;
  SktReadKeyword("point", x, {}, {.instance = 1, .param = 2});
  EXPECT_EQ(x, 2.0);
  SktCloseSection();
  int status = 0;
  SktOpenSection("SOURCE", kNoIndex, &status, false, 3);
  EXPECT_EQ(status, -1);
  SktOpenSection("SOURCE", kNoIndex, &status, false, 1);
  EXPECT_EQ(status, 0);
  SktReadKeyword("name", name);
  EXPECT_EQ(name, "river");
}

TEST_F(SetupTest, MissingSectionAndTargetStopTheRun) {
  Open(kSetup);
  EXPECT_EXIT(SktOpenTarget("Other"), testing::ExitedWithCode(1), "");
  EXPECT_EQ(Body(), (std::vector<std::string>{"SKT target: Other not found", "Abnormal completion"}));
  int status = 0;
  SktOpenTarget("Other", &status);
  EXPECT_EQ(status, -1);
  SktOpenTarget("VantorHD");
  Open(kSetup);
  SktOpenTarget("VantorHD");
  EXPECT_EXIT(SktOpenSection("CODE", 3), testing::ExitedWithCode(1), "");
  EXPECT_EQ(Body(), (std::vector<std::string>{"SKT section: CODE_3 not found", "Abnormal completion"}));
}

// A value of the wrong kind stops the run with a message naming the section
// path, the keyword, the line, the type wanted and the value found.
struct BadValue {
  std::string line;  // the keyword's line in [VantorHD.TIME]
  char reader;       // i integer, d double, f single, b logical, s text, a 3 integers
  std::string message;
};

class BadValueTest : public SetupTest, public ::testing::WithParamInterface<BadValue> {};

void ReadAs(char reader, int* flag) {
  int i = -9;
  double d = -9;
  float f = -9;
  bool b = false;
  std::string s = "kept";
  std::vector<int> a;
  const SktArg arg{.flag = flag};
  switch (reader) {
    case 'i': SktReadKeyword("v", i, -9, arg); EXPECT_EQ(i, -9); break;
    case 'd': SktReadKeyword("v", d, -9.0, arg); EXPECT_EQ(d, -9.0); break;
    case 'f': SktReadKeyword("v", f, -9.0f, arg); EXPECT_EQ(f, -9.0f); break;
    case 'b': SktReadKeyword("v", b, false, arg); EXPECT_FALSE(b); break;
    case 's': SktReadKeyword("v", s, std::string("kept"), arg); EXPECT_EQ(s, "kept"); break;
    default: SktReadKeyword("v", a, 3, std::vector<int>{1, 2, 3}, arg); EXPECT_EQ(a, (std::vector<int>{1, 2, 3}));
  }
}

TEST_P(BadValueTest, StopsOrSetsTheFlag) {
  const BadValue& bad = GetParam();
  Open("[VantorHD]\n[VantorHD.TIME]\nfirst = 1\n" + bad.line + "\n");
  SktOpenTarget("VantorHD");
  SktOpenSection("TIME", kNoIndex, nullptr, false);
  int flag = 0;
  ReadAs(bad.reader, &flag);
  EXPECT_EQ(flag, 1);
  EXPECT_EXIT(ReadAs(bad.reader, nullptr), testing::ExitedWithCode(1), "");
  const std::vector<std::string> body = Body();
  ASSERT_GE(body.size(), 3u);
  EXPECT_EQ(Unwrap(body, 1, 13), "Fatal error: SktReadKeyword: keyword v in section VantorHD/TIME, line 4 of " + setup_path + ": " +
                      bad.message);
  EXPECT_EQ(body.back(), "Abnormal completion");
}

INSTANTIATE_TEST_SUITE_P(
    Setup, BadValueTest,
    ::testing::Values(BadValue{"v = 30.0", 'i', "integer wanted, found 30.0"},
                      BadValue{"v = 3000000000", 'i', "integer within the 32-bit range wanted, found 3000000000"},
                      BadValue{"v = \"30\"", 'd', "number wanted, found \"30\""},
                      BadValue{"v = inf", 'd', "finite number wanted, found inf"},
                      BadValue{"v = 1e300", 'f', "finite single-precision number wanted, found 1e+300"},
                      BadValue{"v = 0.5", 'b', "logical (true, false or an integer) wanted, found 0.5"},
                      BadValue{"v = 5", 's', "text wanted, found 5"},
                      BadValue{"v = [1, 2]", 'a', "3 value(s) wanted, found [1, 2]"},
                      BadValue{"v = [1, 2.5, 3]", 'a', "integer wanted as value 2, found 2.5"},
                      BadValue{"[VantorHD.TIME.v]", 'i', "value wanted, found a section"}));

TEST_F(SetupTest, UnreadableFileAndSyntaxError) {
  const std::string missing = dir.file("none.toml");
  EXPECT_EXIT(SktOpenFile(missing, true), testing::ExitedWithCode(1),
              "");
  int status = 0;
  SktOpenFile(missing, true, -1, &status);
  EXPECT_EQ(status, -1);
  EXPECT_FALSE(SktIsOpen());
  SktOpenFile(dir.path().string(), true, -1, &status);  // a folder is no file
  EXPECT_EQ(status, -1);

  test::WriteTextFile(setup_path, "[VantorHD]\na = 1\nb = = 2\n");
  const std::string out = dir.file("stdout.txt");
  EXPECT_EXIT(
      {
        std::freopen(out.c_str(), "w", stdout);
        SktOpenFile(setup_path, true);
      },
      testing::ExitedWithCode(1), "");
  const std::vector<std::string> lines = test::SplitLines(test::ReadTextFile(out));
  ASSERT_EQ(lines.size(), 4u);
  const std::string text = Unwrap(lines, 1, 14);
  EXPECT_EQ(text.rfind(" Fatal error: Error while parsing", 0), 0u) << text;
  EXPECT_NE(text.find(" near line 3 and colum 5 in file " + setup_path), std::string::npos) << text;
}

TEST_F(SetupTest, UnusedKeywordsOfOpenedSectionsAreWarned) {
  Open("[VantorHD]\n"
       "delete_logfile = 1\n"
       "[VantorHD.TIME]\n"
       "time_step_intervall = 30.0\n"
       "start_time = [2004, 1, 1]\n"
       "number_of_time_steps = 5\n"
       "[VantorHD.OFF_MODULE]\n"
       "anything = 1\n");
  SktOpenTarget("VantorHD");
  int n = 0;
  SktReadKeyword("delete_logfile", n);
  SktOpenSection("TIME", kNoIndex, nullptr, false);
  double dt = 0;
  SktReadKeyword("time_step_interval", dt, 10.0);
  SktReadKeyword("number_of_time_steps", n);
  SktReadKeyword("start_time", n, {}, {.param = 1});
  SktCloseSection();
  SktReportUnusedKeywords();
  const std::vector<std::string> body = Body();
  ASSERT_EQ(body.size(), 12u) << test::ReadTextFile(log_path);
  EXPECT_EQ(body[1], "    time_step_interval : 10 (default)");
  EXPECT_EQ(body[4], "");
  EXPECT_EQ(Unwrap(body, 5, 9),
            "Warning: Keyword time_step_intervall in section VantorHD/TIME, line 4: not used; did you mean "
            "time_step_interval?");
  EXPECT_EQ(body[7], "");
  EXPECT_EQ(Unwrap(body, 8, 9),
            "Warning: Keyword start_time in section VantorHD/TIME, line 5: parameter(s) 2 3 not used");
  // The section that was never opened is reported as a whole, not key by key.
  EXPECT_EQ(test::ReadTextFile(log_path).find("anything"), std::string::npos);
  EXPECT_EQ(body[10], "");
  EXPECT_EQ(Unwrap(body, 11, 9), "Warning: Section OFF_MODULE in section VantorHD, line 7: not used");
}

// A section opened only to find that it is switched off is skipped: none of
// its keywords, nor those of the sections below it, are reported, while its
// siblings and the instances next to it still are.
TEST_F(SetupTest, SkippedSectionsAreNotReportedKeyByKey) {
  Open("[VantorHD.OUTPUTS]\n"
       "number_of_outputs = 2\n"
       "[VantorHD.OUTPUTS.OUTPUT_1]\n"
       "include = 1\n"
       "file_name = \"a.zrnu\"\n"
       "titel = \"typo\"\n"
       "[VantorHD.OUTPUTS.OUTPUT_2]\n"
       "include = 0\n"
       "file_name = \"b.zrnu\"\n"
       "first_time_step = [0, 1]\n"
       "[VantorHD.OUTPUTS.OUTPUT_2.POINTS]\n"
       "number_of_points = 1\n"
       "[[VantorHD.OUTPUTS.OUTPUT_2.POINTS.POINT]]\n"
       "x = 1.0\n"
       "[[VantorHD.SOURCE]]\n"
       "name = \"river\"\n"
       "flow = 1.0\n"
       "[[VantorHD.SOURCE]]\n"
       "name = \"outfall\"\n"
       "flow = 2.0\n");
  SktSkipSection();  // nothing is current yet: no effect
  SktOpenTarget("VantorHD");
  SktOpenSection("OUTPUTS", kNoIndex, nullptr, false);
  int n = 0, include = 0;
  SktReadKeyword("number_of_outputs", n);
  for (int i = 1; i <= n; ++i) {
    SktOpenSection("OUTPUT", i, nullptr, false);
    SktReadKeyword("include", include, 1);
    if (include == 1) {
      std::string name;
      SktReadFileName("file_name", name);
    } else {
      SktSkipSection();
      // A section below a skipped one stays skipped when opened later.
      SktOpenSection("POINTS", kNoIndex, nullptr, false);
      SktOpenSection("POINT", kNoIndex, nullptr, false);
      SktCloseSection();
      SktCloseSection();
    }
    SktCloseSection();
  }
  SktCloseSection();
  for (int k = 1; k <= 2; ++k) {
    SktOpenSection("SOURCE", kNoIndex, nullptr, false, k);
    std::string name;
    SktReadKeyword("name", name);
    if (name == "outfall") SktSkipSection();
    SktCloseSection();
  }
  SktReportUnusedKeywords();
  const std::string log = test::ReadTextFile(log_path);
  const std::vector<std::string> body = Body();
  std::vector<std::string> warnings;
  for (std::size_t k = 0; k < body.size(); ++k)
    if (body[k].rfind("Warning:", 0) == 0) warnings.push_back(Unwrap(body, k, 9));
  ASSERT_EQ(warnings.size(), 2u) << log;
  EXPECT_EQ(warnings[0], "Warning: Keyword titel in section VantorHD/OUTPUTS/OUTPUT_1, line 6: not used");
  EXPECT_EQ(warnings[1], "Warning: Keyword flow in section VantorHD/SOURCE, line 17: not used");
}

// Sections that no reader opened: misspelt ones with the nearest name a
// reader looked for, numbered ones beyond those read without a guess, instances
// of a repeated section beyond those read, and keywords outside the target.
TEST_F(SetupTest, SectionsNeverOpenedAreWarnedWithTheNearestKnownName) {
  Open("stray = 1\n"                                        // 1
       "[VantorHD.HYDRODYNAMIC_MODULE]\n"                   // 2
       "mode = 2\n"                                         // 3
       "[VantorHD.HYDRODYNAMIC_MODULE.BED_RESISTENCE]\n"    // 4
       "type = 4\n"                                         // 5
       "[VantorHD.HYDRODYNAMIC_MODULE.OUTPUT.OUTPUT_1]\n"   // 6
       "file_name = \"a.zrnu\"\n"                           // 7
       "[VantorHD.HYDRODYNAMIC_MODULE.flood_and_dry]\n"     // 8
       "type = 1\n"                                         // 9
       "[VantorHD.HYDRODYNAMIC_MODULE.BOUNDARY_CONDITIONS.CODE_1]\n"  // 10
       "type = 1\n"                                         // 11
       "[VantorHD.HYDRODYNAMIC_MODULE.BOUNDARY_CONDITIONS.CODE_7]\n"  // 12
       "type = 1\n"                                         // 13
       "[VantorHD.HYDRODYNAMIC_MODULE.ZZ_UNKNOWN]\n"        // 14
       "[[VantorHD.HYDRODYNAMIC_MODULE.SOURCE]]\n"          // 15
       "name = \"a\"\n"                                     // 16
       "[[VantorHD.HYDRODYNAMIC_MODULE.SOURCE]]\n"          // 17
       "name = \"b\"\n"                                     // 18
       "[VantorHd.TIME]\n");                                // 19
  SktOpenTarget("VantorHD");
  SktOpenSection("HYDRODYNAMIC_MODULE", kNoIndex, nullptr, false);
  int mode = 0;
  SktReadKeyword("mode", mode);
  for (const char* name : {"BED_RESISTANCE", "OUTPUTS", "FLOOD_AND_DRY", "SOURCE"}) SktSectionExists(name);
  SktOpenSection("SOURCE", kNoIndex, nullptr, false, 1);
  std::string text;
  SktReadKeyword("name", text);
  SktCloseSection();
  SktOpenSection("BOUNDARY_CONDITIONS", kNoIndex, nullptr, false);
  SktOpenSection("CODE", 1, nullptr, false);
  SktReadKeyword("type", mode);
  SktCloseSection();
  SktSectionExists("CODE_2");
  SktCloseSection();
  SktCloseSection();
  SktReportUnusedKeywords();
  const std::vector<std::string> body = Body();
  std::vector<std::string> warnings;
  for (std::size_t k = 0; k < body.size(); ++k)
    if (body[k].rfind("Warning:", 0) == 0) warnings.push_back(Unwrap(body, k, 9));
  const std::string hd = " in section VantorHD/HYDRODYNAMIC_MODULE";
  const std::vector<std::string> expected = {
      "Warning: Keyword stray outside the target, line 1: not used",
      "Warning: Section BED_RESISTENCE" + hd + ", line 4: not used; did you mean BED_RESISTANCE?",
      "Warning: Section OUTPUT" + hd + ", line 6: not used; did you mean OUTPUTS?",
      "Warning: Section flood_and_dry" + hd + ", line 8: not used; did you mean FLOOD_AND_DRY?",
      "Warning: Section CODE_7" + hd + "/BOUNDARY_CONDITIONS, line 12: not used",
      "Warning: Section ZZ_UNKNOWN" + hd + ", line 14: not used",
      "Warning: Section SOURCE(2)" + hd + ", line 17: not used",
      "Warning: Section VantorHd, line 19: not used; did you mean VantorHD?",
  };
  EXPECT_EQ(warnings, expected);
}

}  // namespace
}  // namespace vhd
