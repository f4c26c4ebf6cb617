#include "control/time_loop.hpp"

#include <gtest/gtest.h>

#include <cmath>
#include <fstream>
#include <memory>
#include <string>
#include <vector>

#include "control/module.hpp"
#include "control/progress.hpp"
#include "test_support.hpp"

namespace vhd {
namespace {

using Journal = std::vector<std::string>;

// A module that writes every call into a journal and can be told to choose
// sub-steps, to fail at a step or to create a file at a step.
class RecordingModule final : public Module {
 public:
  RecordingModule(ModuleKind kind, Journal& journal) : kind_(kind), journal_(journal) {}

  double sub_step = 0.0;  // not 0: the sub-step this module chooses (HD)
  int fail_at = -1;       // sets run_status -7 in this step
  int touch_at = -1;      // creates touch_file in this step
  std::string touch_file;
  bool coupling_ok = true;
  int start_step = 0;
  std::vector<double> sub_steps;  // every sub-step length seen

  void Setup(const ModuleContext&) override { Log("setup"); }
  int StartStep() const override { return start_step; }
  bool CheckCoupling(const ModuleSet&) override {
    Log("coupling");
    return coupling_ok;
  }
  void InitialStep(double t, int&) override { Log("initial@" + Num(t)); }
  void OpenOutputs() override { Log("open"); }
  void WriteOutput(int n) override { Log("output" + std::to_string(n)); }
  double TimeStep(double t, double t_end) override {
    return sub_step != 0.0 ? std::fmin(sub_step, t_end - t) : t_end - t;
  }
  void Step(const StepTimes& s, int& run_status) override {
    sub_steps.push_back(s.dt);
    Log("step" + std::to_string(s.n) + "@" + Num(s.t));
    if (s.n == touch_at) test::WriteTextFile(touch_file, "");
    if (s.n == fail_at) run_status = -7;
  }
  void FinishOutputs(int n) override { Log("finish" + std::to_string(n)); }
  void CloseOutputs() override { Log("close"); }
  void PrintStatistics() override { Log("statistics"); }
  void PrintTimings() override { Log("timings"); }

 private:
  static std::string Num(double x) {
    return std::to_string(static_cast<long long>(std::lround(x)));
  }
  void Log(const std::string& what) {
    journal_.push_back(std::string(ModuleKindName(kind_)) + ":" + what);
  }
  ModuleKind kind_;
  Journal& journal_;
};

struct Fixture {
  Journal journal;
  ModuleSet modules;
  TimeAxis time;
  ModuleSelection selection;
  RunControl run;
  TimingSet overall;
  std::array<RecordingModule*, kModuleKinds> m{};

  explicit Fixture(std::initializer_list<ModuleKind> kinds, int steps = 2, double dt = 30.0) {
    time.dt = dt;
    time.last_step = steps;
    InitTiming(overall, "Overall", 4);
    for (int k = 1; k <= 4; ++k) AddTiming(overall, k, "task");
    for (const ModuleKind kind : kinds) {
      auto module = std::make_unique<RecordingModule>(kind, journal);
      m[static_cast<int>(kind)] = module.get();
      modules.Set(kind, std::move(module));
    }
  }
  RecordingModule& operator[](ModuleKind kind) { return *m[static_cast<int>(kind)]; }
  void Run(ProgressChannel* progress = nullptr) {
    RunTimeLoop(modules, time, selection, run, progress, overall);
  }
  // Journal entries that begin with prefix, in order.
  Journal Only(const std::string& prefix) const {
    Journal out;
    for (const auto& e : journal)
      if (e.find(prefix) != std::string::npos) out.push_back(e);
    return out;
  }
};

constexpr auto HD = ModuleKind::HD, TR = ModuleKind::TR, ST = ModuleKind::ST, MT = ModuleKind::MT,
               VT = ModuleKind::VT, PT = ModuleKind::PT;

TEST(SubSteps, VariableSubStepsFillTheOverallStep) {
  Fixture f({HD, TR});
  f[HD].sub_step = 6.0;
  int run_status = 0;
  EXPECT_EQ(RunSubSteps(f.modules, 3, 30.0, run_status), 5);
  EXPECT_EQ(f.Only("HD:step"),
            (Journal{"HD:step3@66", "HD:step3@72", "HD:step3@78", "HD:step3@84", "HD:step3@90"}));
  // Every module advances over the same sub-steps.
  EXPECT_EQ(f[TR].sub_steps, f[HD].sub_steps);

  // Steps that do not divide dt: the last one is cut to the end of the step.
  Fixture g({HD});
  g[HD].sub_step = 7.0;
  EXPECT_EQ(RunSubSteps(g.modules, 1, 30.0, run_status), 5);
  double sum = 0.0;
  for (const double s : g[HD].sub_steps) sum += s;
  EXPECT_NEAR(sum, 30.0, 1e-12);
  EXPECT_NEAR(g[HD].sub_steps.back(), 2.0, 1e-12);
}

TEST(SubSteps, OneSubStepWhenTheTimeStepEqualsDt) {
  Fixture f({HD});
  int run_status = 0;
  EXPECT_EQ(RunSubSteps(f.modules, 1000, 0.1, run_status), 1);
  // A step a little short of dt leaves less than the tolerance: no extra
  // sub-step of almost zero length.
  f[HD].sub_step = 10.0 - 5e-7;
  EXPECT_EQ(RunSubSteps(f.modules, 1, 10.0, run_status), 1);
}

TEST(SubSteps, NonPositiveSubStepIsFatal) {
  Fixture f({HD});
  f[HD].sub_step = -1.0;
  int run_status = 0;
  EXPECT_EXIT(RunSubSteps(f.modules, 1, 30.0, run_status), ::testing::ExitedWithCode(1), "");
}

TEST(TimeLoop, ModulesAreCalledInTheirFixedOrders) {
  Fixture f({HD, TR, ST, MT, VT, PT}, 1);
  f.selection.hd = 2;
  f.Run();
  const Journal expected{
      // initial steps, opening and first outputs (HD's after the banner)
      "HD:coupling", "HD:initial@0", "HD:open", "TR:coupling", "TR:initial@0", "TR:open",
      "TR:output0", "ST:coupling", "ST:initial@0", "ST:open", "ST:output0", "MT:coupling",
      "MT:initial@0", "MT:open", "MT:output0", "VT:coupling", "VT:initial@0", "VT:open",
      "VT:output0", "PT:coupling", "PT:initial@0", "PT:open", "PT:output0", "HD:output0",
      // step 1: one sub-step, particles once after it, then the outputs
      "HD:step1@30", "TR:step1@30", "ST:step1@30", "MT:step1@30", "VT:step1@30", "PT:step1@30",
      "HD:output1", "TR:output1", "ST:output1", "MT:output1", "VT:output1", "PT:output1",
      // closing, statistics and timings
      "HD:close", "TR:close", "ST:close", "MT:close", "VT:close", "PT:close", "HD:statistics",
      "TR:statistics", "MT:statistics", "ST:statistics", "VT:statistics", "PT:statistics",
      "HD:timings", "TR:timings", "MT:timings", "ST:timings", "VT:timings", "PT:timings"};
  EXPECT_EQ(f.journal, expected);
  EXPECT_EQ(f.run.run_status, kRunNormal);
}

TEST(TimeLoop, ParticlesMoveOnceOverTheWholeStep) {
  Fixture f({HD, PT}, 2);
  f[HD].sub_step = 10.0;
  f.Run();
  EXPECT_EQ(f.Only("HD:step").size(), 6u);
  EXPECT_EQ(f.Only("PT:step"), (Journal{"PT:step1@30", "PT:step2@60"}));
  EXPECT_EQ(f[PT].sub_steps, (std::vector<double>{30.0, 30.0}));
}

TEST(TimeLoop, InitialStepsFollowModeAndStartStep) {
  Fixture f({HD, TR}, 0);
  f.selection.hd = 1;    // HD mode 1 has no initial step
  f[TR].start_step = 5;  // TR starts later
  f.Run();
  EXPECT_TRUE(f.Only("initial").empty());
  // Zero steps: the outputs at step 0 are written, no step is taken.
  EXPECT_EQ(f.Only("output"), (Journal{"TR:output0", "HD:output0"}));
  EXPECT_TRUE(f.Only("step").empty());
}

TEST(TimeLoop, FailedCouplingSwitchesTheModuleOff) {
  Fixture f({HD, ST, MT}, 1);
  f[ST].coupling_ok = false;
  f.Run();
  EXPECT_FALSE(f.modules.IsActive(ST));
  EXPECT_EQ(f.Only("ST:"), (Journal{"ST:coupling"}));
  EXPECT_EQ(f.Only("MT:step").size(), 1u);
}

TEST(TimeLoop, NegativeStatusEndsTheLoopWithEmergencyOutput) {
  Fixture f({HD, TR, ST, PT}, 10);
  f[TR].fail_at = 3;
  f.Run();
  EXPECT_EQ(f.run.run_status, -7);
  // The modules after TR in that sub-step are not called, nor is PT.
  EXPECT_EQ(f.Only("TR:step").back(), "TR:step3@90");
  EXPECT_EQ(f.Only("ST:step").back(), "ST:step2@60");
  EXPECT_EQ(f.Only("PT:step").back(), "PT:step2@60");
  // Every module writes its current state, then closes.
  EXPECT_EQ(f.Only("output-1"),
            (Journal{"HD:output-1", "TR:output-1", "ST:output-1", "PT:output-1"}));
  EXPECT_EQ(f.Only("HD:output"),
            (Journal{"HD:output0", "HD:output1", "HD:output2", "HD:output-1"}));
  EXPECT_TRUE(f.Only("finish").empty());
}

TEST(TimeLoop, NegativeStatusAfterTheInitialStepsSkipsTheLoop) {
  Fixture f({HD, TR}, 10);
  f.run.run_status = -2;
  f.Run();
  EXPECT_TRUE(f.Only("step").empty());
  EXPECT_EQ(f.Only("HD:output"), (Journal{"HD:output0", "HD:output-1"}));
}

TEST(TimeLoop, KillFileEndsTheRunAfterTheCurrentStep) {
  test::TempDir dir;
  ProgressChannel progress;
  progress.Open(ProgressMode::None, dir.file("run.log"));
  Fixture f({HD, TR}, 100);
  f[TR].touch_at = 4;
  f[TR].touch_file = progress.KillFile();
  f.Run(&progress);
  EXPECT_EQ(f.run.run_status, kRunStopRequested);
  EXPECT_EQ(f.Only("HD:step").back(), "HD:step4@120");
  EXPECT_EQ(f.Only("TR:output").back(), "TR:output4");
  // Outputs that would have gone on get their closing records.
  EXPECT_EQ(f.Only("finish"), (Journal{"HD:finish4", "TR:finish4"}));
  EXPECT_TRUE(f.Only("output-1").empty());
}

}  // namespace
}  // namespace vhd
