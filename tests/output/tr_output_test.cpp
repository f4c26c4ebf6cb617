// Outputs of the transport module: the messages of their setup.

#include <gtest/gtest.h>

#include <string>

#include "../hydro/setup_support.hpp"
#include "output/tr_output.hpp"

namespace vhd::test {
namespace {

std::string Output(const std::string& path, const std::string& keys) {
  return "[VantorHD.TRANSPORT_MODULE.OUTPUTS" + (path.empty() ? std::string() : "." + path) + "]\n" + keys;
}

struct OutputCase {
  const char* name;
  std::string outputs;
  std::string message;
};

class TransportOutputMessages : public testing::TestWithParam<OutputCase> {};

TEST_P(TransportOutputMessages, StopsTheRun) {
  const OutputCase& c = GetParam();
  HdSetupFixture f;
  const Mesh mesh = MakeMesh(4, 2, 100.0, 100.0, Flat(3.0));
  const std::string body = kHd + "[VantorHD.TRANSPORT_MODULE]\nmode = 2\n" +
                           Output("", "number_of_outputs = 1\n") + c.outputs;
  ExpectStop(
      [&] {
        f.modules.tr = 2;
        f.Setup(body, mesh);
        TrModule tr;
        SetupStructureTR(tr, f.hd, mesh, f.time, f.modules);
        TrOutputs out;
        SetupOutputsTR(out, tr, mesh, f.run, f.time);
      },
      f.log_path, c.message);
}

INSTANTIATE_TEST_SUITE_P(
    Table, TransportOutputMessages,
    testing::Values(
        OutputCase{"NoItems",
                   Output("OUTPUT_1", "file_name = \"a.zrnu\"\n") + Output("OUTPUT_1.PARAMETERS_2D", "U_VELOCITY = false\n"),
                   "No output items specified (section VantorHD/TRANSPORT_MODULE/OUTPUTS/OUTPUT_1/PARAMETERS_2D)"},
        OutputCase{"Type", Output("OUTPUT_1", "file_name = \"a.zrnu\"\ntype = 7\n"),
                   "SpecOutputFileTR: Output type not supported - type 7"},
        OutputCase{"Discharge",
                   Output("OUTPUT_1", "file_name = \"d.zrn0\"\ntype = 4\nformat = 1\n") +
                       Output("OUTPUT_1.LINE", "x_first = 50.0\ny_first = 0.0\nx_last = 50.0\ny_last = 200.0\n"),
                   "SpecOutputFileTR: Output type not supported - type 4"},
        OutputCase{"BudgetNothing",
                   Output("OUTPUT_1", "file_name = \"b.zrn0\"\ntype = 3\nformat = 0\n") +
                       Output("OUTPUT_1.MASSBUDGET", "FLOW = 0\nCOMPONENT_1 = 0\n"),
                   "SpecMassBudget: No components selected"},
        OutputCase{"BudgetPolygon",
                   Output("OUTPUT_1", "file_name = \"b.zrn0\"\ntype = 3\nformat = 0\n") +
                       Output("OUTPUT_1.MASSBUDGET", "number_of_points = 3\n") +
                       Output("OUTPUT_1.MASSBUDGET.POINT_1", "x = 0.0\ny = 0.0\n") +
                       Output("OUTPUT_1.MASSBUDGET.POINT_2", "x = 300.0\ny = 0.0\n") +
                       Output("OUTPUT_1.MASSBUDGET.POINT_3", "x = 0.0\ny = 200.0\n"),
                   "SpecMassBudget: the budget of component COMPONENT_1 covers the whole model area"}),
    [](const testing::TestParamInfo<OutputCase>& info) { return std::string(info.param.name); });

}  // namespace
}  // namespace vhd::test
