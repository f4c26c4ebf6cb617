// The partition of a 2D mesh over the processes: METIS options, balance and
// connectivity of the sub-domains, weights, the partition file and its checks.

#include "parallel/partition.hpp"

#include <metis.h>

#include <algorithm>
#include <numeric>
#include <queue>

#include <fmt/format.h>

#include "io/setup.hpp"
#include "log/log.hpp"
#include "mesh/domain.hpp"
#include "mesh/generate.hpp"
#include "mesh/read_mesh.hpp"
#include "mesh/reorder.hpp"
#include "test_support.hpp"

namespace vhd {
namespace {

using test::TempDir;

Mesh Generated(CellLayout layout, int nx, int ny, double jitter = 0.15, int reordering = kReorderNone) {
  RectangleMeshSpec s;
  s.x1 = 1000.0;
  s.y1 = 600.0;
  s.nx = nx;
  s.ny = ny;
  s.layout = layout;
  s.jitter = jitter;
  s.seed = 11;
  Mesh m;
  GenerateRectangleMesh(s, m);
  if (reordering != kReorderNone) ReorderMesh(m, ElementOrder(m, reordering, 1, m.elements.nelements));
  SetupMeshGeometry(m);
  return m;
}

RunControl Processes(int n) {
  RunControl run;
  run.nprocesses = n;
  run.process_id = 0;
  return run;
}

PartitionSettings Settings(int type) {
  PartitionSettings ps;
  ps.type_of_partitioning = type;
  ps.section = "VantorHD/DOMAIN";
  return ps;
}

std::vector<int> Counts(const Array1<int>& part, int nparts) {
  std::vector<int> count(static_cast<std::size_t>(nparts) + 1, 0);
  for (int p : part) ++count.at(static_cast<std::size_t>(p));
  return count;
}

// Number of face-connected pieces of sub-domain p.
int Pieces(const Mesh& m, const Array1<int>& part, int p) {
  const ElementTable& el = m.elements;
  std::vector<char> seen(static_cast<std::size_t>(el.nelements) + 1, 0);
  int pieces = 0;
  for (int start = 1; start <= el.nelements; ++start) {
    if (part[start] != p || seen[static_cast<std::size_t>(start)]) continue;
    ++pieces;
    std::queue<int> q;
    q.push(start);
    seen[static_cast<std::size_t>(start)] = 1;
    while (!q.empty()) {
      const int e = q.front();
      q.pop();
      for (int j = 1; j <= ElementFaceCount(el, e); ++j) {
        const int f = ElementFace(el, e, j);
        const int o = m.faces.element1[f] == e ? m.faces.element2[f] : m.faces.element1[f];
        if (o > 0 && part[o] == p && !seen[static_cast<std::size_t>(o)]) {
          seen[static_cast<std::size_t>(o)] = 1;
          q.push(o);
        }
      }
    }
  }
  return pieces;
}

// Sub-domain by the x of the element centre: thirds of the rectangle.
Array1<int> Thirds(const Mesh& m, int first = 1) {
  Array1<int> part(m.elements.nelements);
  for (int e = 1; e <= m.elements.nelements; ++e)
    part[e] = first + std::min(2, static_cast<int>(m.elements.xc[e] / (1000.0 / 3)));
  return part;
}

// ---- METIS options -----------------------------------------------------------------------

TEST(Metis5Options, SchemeAndImbalanceFollowTheNumberOfSubdomains) {
  struct Case {
    int nparts, ptype, ufactor;
  } cases[] = {{2, METIS_PTYPE_RB, 1}, {7, METIS_PTYPE_RB, 1}, {8, METIS_PTYPE_KWAY, 30}, {64, METIS_PTYPE_KWAY, 30}};
  for (const Case& c : cases) {
    const std::vector<int> o = Metis5Options(Settings(kPartitionMetis5), c.nparts);
    ASSERT_EQ(o.size(), static_cast<std::size_t>(METIS_NOPTIONS));
    EXPECT_EQ(o[METIS_OPTION_PTYPE], c.ptype) << c.nparts;
    EXPECT_EQ(o[METIS_OPTION_UFACTOR], c.ufactor) << c.nparts;
    EXPECT_EQ(o[METIS_OPTION_OBJTYPE], METIS_OBJTYPE_CUT);
    EXPECT_EQ(o[METIS_OPTION_NITER], 20);
    EXPECT_EQ(o[METIS_OPTION_NCUTS], 5);
    EXPECT_EQ(o[METIS_OPTION_SEED], 5489);
    EXPECT_EQ(o[METIS_OPTION_NUMBERING], 0);
    EXPECT_EQ(o[METIS_OPTION_CTYPE], -1);  // METIS's own default
  }
}

TEST(Metis5Options, SetupKeysOverrideEntries) {
  TempDir dir;
  test::WriteTextFile(dir.file("run.toml"),
                      "[VantorHD.DOMAIN]\nuse_METIS5_options = 1\noption_16 = 50\noption_7 = 1\noption_11 = 1\n");
  SktOpenFile(dir.file("run.toml"), false);
  SktOpenTarget("VantorHD");
  SktOpenSection("DOMAIN");
  PartitionSettings ps;
  ReadPartitionKeys(ps);
  SktCloseSection();
  SktClose();
  EXPECT_FALSE(ps.number_of_domains_given);
  EXPECT_EQ(ps.type_of_partitioning, kPartitionMetis5);
  for (int nparts : {7, 8}) {
    const std::vector<int> o = Metis5Options(ps, nparts);
    EXPECT_EQ(o[METIS_OPTION_UFACTOR], 50);
    EXPECT_EQ(o[METIS_OPTION_NCUTS], 1);
    EXPECT_EQ(o[METIS_OPTION_CONTIG], 1);
    EXPECT_EQ(o[METIS_OPTION_SEED], 5489);
  }
}

TEST(PartitionKeys, BadValuesStopNamingTheKey) {
  struct Case {
    const char* keys;
    const char* text;
  } cases[] = {
      {"type_of_partitioning = 6\n", "Illegal type of partitioning: type_of_partitioning = 6"},
      {"type_of_partitioning = 0\n", "Illegal type of partitioning"},
      {"type_of_weighting = 2\n", "type_of_weighting = 2 in VantorHD/DOMAIN"},
      {"use_METIS5_options = 1\noption_17 = 1\n", "option_17 = 1"},
      {"small_master_partition = -1\n", "small_master_partition = -1"},
      {"type_of_halo_layer = 3\n", "type_of_halo_layer = 3"},
  };
  for (const Case& c : cases) {
    TempDir dir;
    test::WriteTextFile(dir.file("run.toml"), std::string("[VantorHD.DOMAIN]\n") + c.keys);
    EXPECT_FATAL(
        {
          SktOpenFile(dir.file("run.toml"), false);
          SktOpenTarget("VantorHD");
          SktOpenSection("DOMAIN");
          PartitionSettings ps;
          ReadPartitionKeys(ps);
        },
        c.text);
  }
}

// ---- computed partitions ------------------------------------------------------------------

struct ComputedCase {
  const char* name;
  CellLayout layout;
  int type, nparts;
  double imbalance;  // largest sub-domain over the mean
};

class ComputedPartition : public ::testing::TestWithParam<ComputedCase> {};

TEST_P(ComputedPartition, BalancedNonEmptyDeterministic) {
  const ComputedCase& c = GetParam();
  const Mesh m = Generated(c.layout, 30, 18, 0.15, kReorderHilbert);
  const PartitionSettings ps = Settings(c.type);
  const Array1<int> part = PartitionMesh(m, ps, Processes(c.nparts));
  const std::vector<int> count = Counts(part, c.nparts);
  const double mean = static_cast<double>(m.elements.nelements) / c.nparts;
  for (int p = 1; p <= c.nparts; ++p) {
    EXPECT_GT(count[static_cast<std::size_t>(p)], 0) << p;
    EXPECT_LE(count[static_cast<std::size_t>(p)], c.imbalance * mean) << p;
    if (c.type != kPartitionNoMetis) {
      EXPECT_EQ(Pieces(m, part, p), 1) << "sub-domain " << p;
    }
  }
  EXPECT_EQ(count[0], 0);
  const Array1<int> again = PartitionMesh(m, ps, Processes(c.nparts));
  EXPECT_TRUE(std::equal(part.begin(), part.end(), again.begin()));
}

INSTANTIATE_TEST_SUITE_P(
    Layouts, ComputedPartition,
    ::testing::Values(ComputedCase{"TrianglesRecursive", CellLayout::kRightTriangles, kPartitionMetis5, 7, 1.01},
                      ComputedCase{"JitteredTrianglesKway", CellLayout::kRandomTriangles, kPartitionMetis5, 8, 1.04},
                      ComputedCase{"QuadrilateralsRecursive", CellLayout::kQuadrilaterals, kPartitionMetis5, 3, 1.01},
                      ComputedCase{"QuadrilateralsKway", CellLayout::kQuadrilaterals, kPartitionMetis5, 12, 1.04},
                      ComputedCase{"MixedRecursive", CellLayout::kMixed, kPartitionMetis5, 2, 1.01},
                      ComputedCase{"MixedKway", CellLayout::kMixed, kPartitionMetis5, 9, 1.04},
                      ComputedCase{"MixedMetis4", CellLayout::kMixed, kPartitionMetis4, 4, 1.01},
                      ComputedCase{"TrianglesMultiLayer", CellLayout::kRandomTriangles, kPartitionMultiLayer, 5, 1.01},
                      ComputedCase{"TrianglesWithoutMetis", CellLayout::kRandomTriangles, kPartitionNoMetis, 7, 1.01},
                      ComputedCase{"QuadrilateralsWithoutMetis", CellLayout::kQuadrilaterals, kPartitionNoMetis, 16,
                                   1.01},
                      ComputedCase{"MixedWithoutMetis", CellLayout::kMixed, kPartitionNoMetis, 3, 1.01}),
    [](const ::testing::TestParamInfo<ComputedCase>& info) { return std::string(info.param.name); });

TEST(PartitionMesh, OneElementPerSubdomainAndTooFewElements) {
  const Mesh m = Generated(CellLayout::kQuadrilaterals, 2, 2, 0.0);  // 4 elements
  for (int type : {kPartitionMetis5, kPartitionNoMetis}) {
    const Array1<int> part = PartitionMesh(m, Settings(type), Processes(4));
    const std::vector<int> count = Counts(part, 4);
    EXPECT_EQ(count, (std::vector<int>{0, 1, 1, 1, 1})) << type;
    EXPECT_FATAL(PartitionMesh(m, Settings(type), Processes(5)),
                 "Number of elements in 2D mesh must be larger or equal to the number of subdomains");
  }
  // One process: one sub-domain, no METIS call.
  const Array1<int> single = PartitionMesh(m, Settings(kPartitionMetis5), RunControl{});
  EXPECT_EQ(Counts(single, 1), (std::vector<int>{0, 4}));
}

TEST(PartitionMesh, NumberOfDomainsMustMatchTheProcesses) {
  const Mesh m = Generated(CellLayout::kRightTriangles, 6, 4);
  PartitionSettings ps = Settings(kPartitionMetis5);
  ps.number_of_domains = 4;  // the default 16 with the key absent follows the processes
  EXPECT_EQ(Counts(PartitionMesh(m, ps, Processes(3)), 3).size(), 4u);
  ps.number_of_domains_given = true;
  EXPECT_FATAL(PartitionMesh(m, ps, Processes(3)), "number_of_domains = 4 in VantorHD/DOMAIN, the run has 3");
  ps.number_of_domains = 0;
  EXPECT_EQ(Counts(PartitionMesh(m, ps, Processes(3)), 3).size(), 4u);
  ps.number_of_domains = -1;
  EXPECT_FATAL(PartitionMesh(m, ps, Processes(3)), "Illegal number of partitions");
}

TEST(PartitionMesh, SmallMasterPartitionTakesItsShare) {
  const Mesh m = Generated(CellLayout::kMixed, 28, 20);
  for (int type : {kPartitionMetis5, kPartitionNoMetis}) {
    PartitionSettings ps = Settings(type);
    ps.small_master_partition = 3;  // shares 1 : 3 : 3
    const std::vector<int> count = Counts(PartitionMesh(m, ps, Processes(3)), 3);
    const double n = m.elements.nelements;
    EXPECT_NEAR(count[1] / n, 1.0 / 7, 0.01) << type;
    EXPECT_NEAR(count[2] / n, 3.0 / 7, 0.01) << type;
    EXPECT_NEAR(count[3] / n, 3.0 / 7, 0.01) << type;
  }
}

TEST(PartitionMesh, WeightsFromAFileBalanceTheLoad) {
  // Elements in the west third weigh 5, the others 1: two equal loads put
  // far fewer elements into the west sub-domain.
  TempDir dir;
  const Mesh m = Generated(CellLayout::kRandomTriangles, 30, 12);
  Array1<int> weight(m.elements.nelements);
  for (int e = 1; e <= m.elements.nelements; ++e) weight[e] = m.elements.xc[e] < 1000.0 / 3 ? 5 : 1;
  WritePartitionFile(m, weight, dir.file("weights.zrnu"));
  long long total = 0;
  for (int w : weight) total += w;
  for (int type : {kPartitionMetis5, kPartitionNoMetis}) {
    PartitionSettings ps = Settings(type);
    ps.type_of_weighting = kWeightFile;
    ps.file_name_weighting = dir.file("weights.zrnu");
    const Array1<int> part = PartitionMesh(m, ps, Processes(2));
    long long load[3] = {0, 0, 0};
    for (int e = 1; e <= m.elements.nelements; ++e) load[part[e]] += weight[e];
    EXPECT_NEAR(static_cast<double>(load[1]) / total, 0.5, 0.01) << type;
    const std::vector<int> count = Counts(part, 2);
    EXPECT_LT(std::min(count[1], count[2]), 0.4 * m.elements.nelements) << type;
  }
}

// ---- partition files ----------------------------------------------------------------------

TEST(PartitionFile, RoundTripOnRenumberedMeshes) {
  TempDir dir;
  const Mesh in_file_order = Generated(CellLayout::kMixed, 20, 14);
  for (int reordering : {kReorderHilbert, kReorderCuthillMcKee}) {
    const Mesh renumbered = Generated(CellLayout::kMixed, 20, 14, 0.15, reordering);
    PartitionSettings ps = Settings(kPartitionMetis5);
    ps.write_partitioning = 1;
    ps.folder = dir.path().string() + "/";
    const Array1<int> part = PartitionMesh(renumbered, ps, Processes(5));
    const std::string file = dir.file("partitioning_5.zrnu");
    ASSERT_TRUE(std::filesystem::exists(file));

    PartitionSettings back = Settings(kPartitionFile);
    back.file_name_partitioning = file;
    const Array1<int> same = PartitionMesh(renumbered, back, Processes(5));
    EXPECT_TRUE(std::equal(part.begin(), part.end(), same.begin())) << reordering;
    const Array1<int> by_file = PartitionMesh(in_file_order, back, Processes(5));
    for (int e = 1; e <= renumbered.elements.nelements; ++e)
      ASSERT_EQ(by_file[renumbered.elements.file_index[e]], part[e]) << reordering << " element " << e;
  }
}

TEST(PartitionFile, NumberOfSubdomainsFromTheFile) {
  TempDir dir;
  const Mesh m = Generated(CellLayout::kQuadrilaterals, 9, 4);
  WritePartitionFile(m, Thirds(m), dir.file("three.zrnu"));
  PartitionSettings ps = Settings(kPartitionFile);
  ps.file_name_partitioning = dir.file("three.zrnu");
  ps.number_of_domains_given = true;
  ps.number_of_domains = 0;
  const Array1<int> part = PartitionMesh(m, ps, Processes(3));
  EXPECT_TRUE(std::equal(part.begin(), part.end(), Thirds(m).begin()));
  ps.number_of_domains = 3;
  EXPECT_EQ(Counts(PartitionMesh(m, ps, Processes(3)), 3), Counts(part, 3));
  ps.number_of_domains = 4;
  EXPECT_FATAL(PartitionMesh(m, ps, Processes(4)), "Illegal number of partitions");
  ps.number_of_domains = 0;
  EXPECT_FATAL(PartitionMesh(m, ps, Processes(2)), "holds 3 sub-domains, the run has 2 processes");
}

TEST(PartitionFile, BadFilesAndItemsStop) {
  TempDir dir;
  const Mesh m = Generated(CellLayout::kQuadrilaterals, 9, 4);
  WritePartitionFile(m, Thirds(m), dir.file("three.zrnu"));
  WritePartitionFile(m, Thirds(m, 0), dir.file("zero.zrnu"));
  Array1<int> gap = Thirds(m);
  for (int& p : gap) p = p == 2 ? 3 : p;
  WritePartitionFile(m, gap, dir.file("gap.zrnu"));
  const Mesh other = Generated(CellLayout::kQuadrilaterals, 8, 4);
  WritePartitionFile(other, Thirds(other), dir.file("other.zrnu"));
  test::WriteTextFile(dir.file("text.mesh"), "not a partition\n");
  struct Case {
    std::string file;
    int item;
    const char* text;
  } cases[] = {
      {"missing.zrnu", 1, "missing.zrnu (file_name_partitioning"},
      {"three.zrnu", 2, "item 2 asked for, the file has 1 items"},
      {"other.zrnu", 1, "not on the mesh of the run"},
      {"zero.zrnu", 1, "sub-domains count from 1"},
      {"gap.zrnu", 1, "sub-domain 2 of the partition file"},
      {"text.mesh", 1, "is not a .zrnu file"},
      {"", 1, "no file given"},
  };
  for (const Case& c : cases) {
    PartitionSettings ps = Settings(kPartitionFile);
    ps.file_name_partitioning = c.file.empty() ? "" : dir.file(c.file);
    ps.item_number_partitioning = c.item;
    EXPECT_FATAL(PartitionMesh(m, ps, Processes(3)), c.text);
  }
  PartitionSettings ps = Settings(kPartitionMetis5);
  ps.type_of_weighting = kWeightFile;
  ps.file_name_weighting = dir.file("zero.zrnu");
  EXPECT_FATAL(PartitionMesh(m, ps, Processes(2)), "weights must be positive");
}

TEST(PartitionFile, SummaryAndFileOnlyFromProcessZero) {
  TempDir dir;
  const Mesh m = Generated(CellLayout::kRightTriangles, 8, 5);
  PartitionSettings ps = Settings(kPartitionMetis4);
  ps.write_partitioning = 1;
  ps.file_name_partitioning = dir.file("mine.zrnu");
  RunControl run = Processes(2);
  run.process_id = 1;
  const std::string log = dir.file("run.log");
  OpenLogFile(log);
  const Array1<int> part = PartitionMesh(m, ps, run);
  CloseLogFile();
  EXPECT_FALSE(std::filesystem::exists(dir.file("mine.zrnu")));
  const std::vector<int> count = Counts(part, 2);
  const std::string text = test::ReadTextFile(log);
  EXPECT_NE(text.find("type_of_partitioning 4 runs as METIS 5"), std::string::npos);
  EXPECT_NE(text.find("Partition\n  Number of partitions: 2\n"), std::string::npos) << text;
  EXPECT_NE(text.find("  Partition    Number of 2D elements\n" + fmt::format("  {:9d}{:25d}\n", 1, count[1]) +
                      fmt::format("  {:9d}{:25d}\n", 2, count[2])),
            std::string::npos)
      << text;
  run.process_id = 0;
  PartitionMesh(m, ps, run);
  EXPECT_TRUE(std::filesystem::exists(dir.file("mine.zrnu")));
}

}  // namespace
}  // namespace vhd
