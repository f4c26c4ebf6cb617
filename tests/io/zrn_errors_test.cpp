// Every numbered error of the data-file layer that a caller can provoke:
// with a status argument the code is stored and the call returns; without
// one the run stops with "ZRN Error: " and the text, naming the file.

#include <gtest/gtest.h>
#include <netcdf.h>
#include <unistd.h>

#include <cmath>
#include <filesystem>
#include <vector>

#include "io/units.hpp"
#include "io/zrn.hpp"
#include "test_support.hpp"
#include "zrn_support.hpp"

namespace vhd {
namespace {

constexpr ZrnDateTime kStart{2010, 6, 1, 12, 0, 0};

// A closed .zrn0 file with `nitems` point items, `nsteps` steps and one static item.
std::string MakeSeries(const test::TempDir& dir, const std::string& file, int nitems, int nsteps) {
  const std::string name = dir.file(file);
  ZrnFile w = test::StartSeries(name, nitems);
  ZrnItemInfo info;
  info.name = "Station depth";
  info.item_type = kUvqIWaterDepth;
  info.unit = kUvqUmeter;
  info.axis.type = kZrnAxisD0;
  int sno = 0;
  zrnStaticCreate(w, info, sno);
  const double depth = 4.5;
  zrnStaticWrite(w, sno, &depth, 1);
  for (int s = 0; s < nsteps; ++s)
    for (int k = 1; k <= nitems; ++k) {
      const double v = s + 0.1 * k;
      zrnWriteItemTimeStep(w, 0, &v, 1);
    }
  zrnFileClose(w);
  return name;
}

TEST(ZrnErrors, TextsOfTheCodes) {
  EXPECT_EQ(zrnErrorText(101), "Unable to open ZRN file");
  EXPECT_EQ(zrnErrorText(403), "Static write call after dynamic");
  EXPECT_EQ(zrnErrorText(999), "Unknown error: 999");
}

TEST(ZrnErrors, OpeningAndFileType) {
  test::TempDir dir;
  ZrnFile f;
  int status = 0;
  EXPECT_EQ(zrnFileRead(f, dir.file("missing.zrn0"), &status), kZrnErrOpen);
  EXPECT_EQ(status, kZrnErrOpen);
  test::WriteTextFile(dir.file("text.zrn0"), "not a data file\n");
  EXPECT_EQ(zrnFileRead(f, dir.file("text.zrn0"), &status), kZrnErrOpen);
  // A time series renamed to .zrnu has no mesh.
  const std::string series = MakeSeries(dir, "s.zrn0", 1, 1);
  std::filesystem::copy_file(series, dir.file("s.zrnu"));
  EXPECT_EQ(zrnFileRead(f, dir.file("s.zrnu"), &status), kZrnErrFileType);
  // A mesh file type for a .zrn0 name.
  zrnHeaderCreate(f, dir.file("m.zrn0"), kZrnFileMesh2D, "mesh");
  zrnSetEqCalendarAxis(f, kStart, 1.0);
  EXPECT_EQ(zrnFileCreate(f, true, &status), kZrnErrFileType);
  // An unknown file type code.
  EXPECT_EQ(zrnHeaderCreate(f, dir.file("x.zrn0"), 77, "x", &status), kZrnErrCreateHeader);
}

TEST(ZrnErrors, HeaderItemsAndAxes) {
  test::TempDir dir;
  ZrnFile f;
  int status = 0;
  zrnHeaderCreate(f, dir.file("h.zrn1"), kZrnFileData, "h");
  EXPECT_EQ(zrnSetItemInfo(f, 2, "Gap", kUvqIWaterLevel, kUvqUmeter, kZrnFloat, &status),
            kZrnErrItemNumber);
  EXPECT_EQ(zrnSetItemInfo(f, 1, "", kUvqIWaterLevel, kUvqUmeter, kZrnFloat, &status), kZrnErrItem);
  EXPECT_EQ(zrnSetItemInfo(f, 1, "Level", kUvqIWaterLevel, kUvqUmeter, 3, &status), kZrnErrItem);
  EXPECT_EQ(zrnSetItemValueType(f, 1, 9, &status), kZrnErrItem);
  EXPECT_EQ(zrnItemEnableCompression(f, 1, 11, &status), kZrnErrItem);
  EXPECT_EQ(zrnSetItemAxisEqD1(f, 1, 0, 0.0, 1.0, &status), kZrnErrSpatialAxis);
  EXPECT_EQ(zrnSetItemAxisEqD1(f, 1, 5, 0.0, 0.0, &status), kZrnErrSpatialAxis);
  EXPECT_EQ(zrnSetItemAxisEqD2(f, 1, 5, 4, 0.0, 0.0, 1.0, std::nan(""), &status), kZrnErrSpatialAxis);
  EXPECT_EQ(zrnSetItemAxisEqD4(f, 1, 9, 5, &status), kZrnErrSpatialAxis);
  EXPECT_EQ(zrnSetEqCalendarAxis(f, kStart, 0.0, &status), kZrnErrTimeAxis);
  EXPECT_EQ(zrnSetEqCalendarAxis(f, ZrnDateTime{2010, 2, 30, 0, 0, 0}, 60.0, &status),
            kZrnErrTimeAxis);
  EXPECT_EQ(zrnAddCustomBlock(f, "VX7_Misc", std::vector<int>{}, &status), kZrnErrAddBlock);
  EXPECT_EQ(zrnAddCustomBlock(f, "bad name", std::vector<int>{1}, &status), kZrnErrAddBlock);
  double v = 0;
  EXPECT_EQ(zrnGetCustomBlockValue(f, "VX7_Misc", 1, v, &status), kZrnErrGetBlock);
  zrnAddCustomBlock(f, "VX7_Misc", std::vector<int>{1});
  EXPECT_EQ(zrnGetCustomBlockValue(f, "VX7_Misc", 2, v, &status), kZrnErrGetBlock);
  EXPECT_EQ(zrnSetCustomBlockValue(f, "Other", 1, 1.0, &status), kZrnErrSetBlock);

  // No time axis yet.
  zrnSetItemInfo(f, 1, "Level", kUvqIWaterLevel, kUvqUmeter);
  zrnSetItemAxisEqD1(f, 1, 3, 0.0, 1.0);
  EXPECT_EQ(zrnFileCreate(f, true, &status), kZrnErrTimeAxis);
  // Items of one line file must share one axis.
  zrnSetEqCalendarAxis(f, kStart, 60.0);
  zrnSetItemInfo(f, 2, "Speed", kUvqICurrentSpeed, kUvqUmeterPerSec);
  zrnSetItemAxisEqD1(f, 2, 4, 0.0, 1.0);
  EXPECT_EQ(zrnFileCreate(f, true, &status), kZrnErrSpatialAxis);
  // A point axis in a line file.
  zrnSetItemAxisEqD0(f, 2);
  EXPECT_EQ(zrnFileCreate(f, true, &status), kZrnErrSpatialAxis);
  // A folder that does not exist.
  ZrnFile g;
  zrnHeaderCreate(g, dir.file("no/such/dir.zrn0"), kZrnFileData, "g");
  zrnSetEqCalendarAxis(g, kStart, 60.0);
  EXPECT_EQ(zrnFileCreate(g, true, &status), kZrnErrCreateFile);
  // The header is closed once the file exists.
  ZrnFile h;
  zrnHeaderCreate(h, dir.file("h.zrn0"), kZrnFileData, "h");
  zrnSetEqCalendarAxis(h, kStart, 60.0);
  ASSERT_EQ(zrnFileCreate(h), 0);
  EXPECT_EQ(zrnSetItemInfo(h, 1, "Late", kUvqIWaterLevel, kUvqUmeter, kZrnFloat, &status),
            kZrnErrItem);
  EXPECT_EQ(zrnSetDeleteValFloat(h, 1.0, &status), kZrnErrCreateHeader);
  EXPECT_EQ(zrnFileCreate(h, true, &status), kZrnErrCreateFile);
  zrnFileClose(h);
}

TEST(ZrnErrors, WritingRecords) {
  test::TempDir dir;
  int status = 0;
  ZrnFile f;
  zrnHeaderCreate(f, dir.file("w.zrn0"), kZrnFileData, "w");
  zrnSetNeqCalendarAxis(f, kStart);
  zrnSetItemInfo(f, 1, "Level", kUvqIWaterLevel, kUvqUmeter);
  zrnSetItemAxisEqD0(f, 1);
  ASSERT_EQ(zrnFileCreate(f), 0);
  ZrnItemInfo info;
  info.name = "Depth";
  info.axis.type = kZrnAxisD0;
  int sno = 0;
  ASSERT_EQ(zrnStaticCreate(f, info, sno), 0);
  const double two[2] = {1.0, 2.0};
  EXPECT_EQ(zrnStaticWrite(f, sno, two, 2, &status), kZrnErrWriteStatic);
  EXPECT_EQ(zrnStaticWrite(f, sno + 1, two, 1, &status), kZrnErrStaticBlock);
  EXPECT_EQ(zrnWriteItemTimeStep(f, 0.0, two, 2, &status), kZrnErrWriteDynamic);
  ASSERT_EQ(zrnWriteItemTimeStep(f, 10.0, two, 1), 0);
  // Times of a non-equidistant axis must increase.
  EXPECT_EQ(zrnWriteItemTimeStep(f, 10.0, two, 1, &status), kZrnErrTimeAxis);
  EXPECT_EQ(zrnStaticWrite(f, sno, two, 1, &status), kZrnErrStaticWriteAfterDynamic);
  EXPECT_EQ(zrnStaticCreate(f, info, sno, &status), kZrnErrStaticWriteAfterDynamic);
  ASSERT_EQ(zrnFileClose(f), 0);
  EXPECT_EQ(zrnFileFlush(f, &status), kZrnErrFlush);
  EXPECT_EQ(zrnFileClose(f, &status), kZrnErrFlush);

  // A file opened for reading takes no records.
  const std::string series = MakeSeries(dir, "r.zrn0", 1, 2);
  ZrnFile r;
  ASSERT_EQ(zrnFileRead(r, series), 0);
  EXPECT_EQ(zrnWriteItemTimeStep(r, 0.0, two, 1, &status), kZrnErrWriteDynamic);
  EXPECT_EQ(zrnStaticWrite(r, 1, two, 1, &status), kZrnErrWriteStatic);
  zrnFileClose(r);
}

// A static item shares the file's x and y: one that places them elsewhere
// would move the dynamic items' grid, so it is refused and the grid stays.
TEST(ZrnErrors, StaticItemMustFitTheGridOfTheFile) {
  test::TempDir dir;
  int status = 0;
  ZrnFile f;
  const std::string name = dir.file("g.zrn2");
  zrnHeaderCreate(f, name, kZrnFileData, "g");
  zrnSetEqCalendarAxis(f, kStart, 60.0);
  zrnSetItemInfo(f, 1, "Level", kUvqIWaterLevel, kUvqUmeter);
  zrnSetItemAxisEqD2(f, 1, 3, 2, 100.0, 200.0, 10.0, -20.0);
  ASSERT_EQ(zrnFileCreate(f), 0);
  ZrnItemInfo info;
  info.name = "Bed level";
  info.axis = f.items[0].axis;
  int sno = 0;
  info.axis.x0[0] = 105.0;
  EXPECT_EQ(zrnStaticCreate(f, info, sno, &status), kZrnErrSpatialAxis);
  EXPECT_NE(f.detail.find("axis x"), std::string::npos) << f.detail;
  info.axis.x0[0] = 100.0;
  info.axis.dx[1] = 20.0;
  EXPECT_EQ(zrnStaticCreate(f, info, sno, &status), kZrnErrSpatialAxis);
  info.axis.dx[1] = 0.0;
  EXPECT_EQ(zrnStaticCreate(f, info, sno, &status), kZrnErrSpatialAxis);
  info.axis.dx[1] = -20.0;
  ASSERT_EQ(zrnStaticCreate(f, info, sno, &status), kZrnOk);
  EXPECT_EQ(sno, 1);
  ASSERT_EQ(zrnFileClose(f), 0);

  ZrnFile r;
  ASSERT_EQ(zrnFileRead(r, name), 0);
  ZrnSpatialAxis a;
  ASSERT_EQ(zrnGetItemDim(r, 1, a), 0);
  EXPECT_EQ(a.x0[0], 100.0);
  EXPECT_EQ(a.dx[1], -20.0);
  int nstatics = 0;
  zrnGetNoOfStatics(r, nstatics);
  EXPECT_EQ(nstatics, 1);
  zrnFileClose(r);
}

TEST(ZrnErrors, ReadingRecords) {
  test::TempDir dir;
  int status = 0;
  const std::string name = MakeSeries(dir, "r.zrn0", 2, 2);
  ZrnFile r;
  ASSERT_EQ(zrnFileRead(r, name), 0);
  ZrnItemInfo info;
  double v[2];
  int item = 0;
  double t = 0;
  EXPECT_EQ(zrnStaticGetData(r, v, 1, &status), kZrnErrReadStatic);  // no static read yet
  ASSERT_EQ(zrnStaticRead(r, info), 0);
  EXPECT_EQ(info.name, "Station depth");
  EXPECT_EQ(zrnStaticGetData(r, v, 2, &status), kZrnErrReadStatic);
  ASSERT_EQ(zrnStaticGetData(r, v, 1), 0);
  EXPECT_EQ(v[0], 4.5);
  EXPECT_EQ(zrnStaticRead(r, info, &status), kZrnErrStaticBlock);
  EXPECT_EQ(zrnStaticSkip(r, &status), kZrnErrStaticBlock);
  std::string iname;
  int a = 0, b = 0, c = 0;
  EXPECT_EQ(zrnGetItemInfo(r, 3, iname, a, b, c, &status), kZrnErrItemNumber);
  EXPECT_EQ(zrnFindItemDynamic(r, 0, 5, &status), kZrnErrItemNumber);
  EXPECT_EQ(zrnFindItemDynamic(r, 2, 1, &status), kZrnErrDynamicBlock);
  EXPECT_EQ(zrnReadItemTimeStep(r, item, t, v, 2, &status), kZrnErrReadDynamic);
  for (int k = 0; k < 4; ++k) ASSERT_EQ(zrnReadItemTimeStep(r, item, t, v, 1), 0);
  EXPECT_EQ(zrnReadItemTimeStep(r, item, t, v, 1, &status), kZrnErrReadDynamic);
  EXPECT_EQ(zrnSkipItem(r, &status), kZrnErrSkip);
  EXPECT_EQ(zrnSkipTimeStep(r, &status), kZrnErrSkip);
  EXPECT_EQ(zrnStaticRead(r, info, &status), kZrnErrStaticAfterDynamic);
  EXPECT_EQ(zrnStaticSkip(r, &status), kZrnErrStaticAfterDynamic);
  double dt = 0;
  ZrnDateTime start;
  int n = 0;
  EXPECT_EQ(zrnGetNeqCalendarAxis(r, start, dt, n, &status), kZrnErrTimeAxis);
  EXPECT_EQ(zrnGetStepTime(r, 2, dt, &status), kZrnErrTimeAxis);
  zrnFileClose(r);

  ZrnFile none;
  EXPECT_EQ(zrnGetNoOfStatics(none, n, &status), kZrnErrStaticCount);
  const std::string statics_only = MakeSeries(dir, "static.zrn0", 0, 0);
  ASSERT_EQ(zrnFileRead(none, statics_only), 0);
  EXPECT_EQ(zrnReadItemTimeStep(none, item, t, v, 1, &status), kZrnErrDynamicBlock);
  zrnFileClose(none);
}

TEST(ZrnErrors, ForeignFilesWithUnusableTimeAxes) {
  test::TempDir dir;
  struct Case {
    const char* units;
    const char* calendar;
    double t1;
  };
  const Case cases[] = {{"months since 2000-01-01", nullptr, 1.0},
                        {"days since 2000-01-01", "noleap", 1.0},
                        {"days since someday", nullptr, 1.0},
                        {"days since 2000-01-01", nullptr, 0.0}};  // not increasing
  int k = 0;
  for (const Case& c : cases) {
    const std::string name = dir.file("bad" + std::to_string(++k) + ".nc");
    int ncid, dim, tv, dv;
    ASSERT_EQ(nc_create(name.c_str(), NC_NETCDF4, &ncid), NC_NOERR);
    nc_def_dim(ncid, "time", 2, &dim);
    nc_def_var(ncid, "time", NC_DOUBLE, 1, &dim, &tv);
    nc_put_att_text(ncid, tv, "units", strlen(c.units), c.units);
    if (c.calendar != nullptr) nc_put_att_text(ncid, tv, "calendar", strlen(c.calendar), c.calendar);
    nc_def_var(ncid, "h", NC_FLOAT, 1, &dim, &dv);
    nc_enddef(ncid);
    const double t[2] = {0.0, c.t1};
    nc_put_var_double(ncid, tv, t);
    nc_close(ncid);
    ZrnFile r;
    int status = 0;
    EXPECT_EQ(zrnFileRead(r, name, &status), kZrnErrTimeAxis) << c.units;
  }
}

TEST(ZrnErrors, UnitOfAnInputItemMustFitTheRequiredType) {
  test::TempDir dir;
  const std::string name = MakeSeries(dir, "u.zrn0", 1, 1);
  ZrnFile r;
  ASSERT_EQ(zrnFileRead(r, name), 0);
  int status = -1;
  EXPECT_EQ(ZrnCheckItemUnit(r, 1, kUvqIWaterDepth, &status), 0);
  EXPECT_EQ(status, 0);
  EXPECT_EQ(ZrnCheckItemUnit(r, 1, kUvqIWindSpeed, &status), kZrnErrItem);
  EXPECT_EQ(ZrnCheckItemUnit(r, 2, kUvqIWindSpeed, &status), kZrnErrItemNumber);
  EXPECT_EXIT(
      {
        dup2(2, 1);
        ZrnCheckItemUnit(r, 1, kUvqIWindSpeed);
      },
      testing::ExitedWithCode(1),
      "Fatal error: The Item type: Water Level does not have the required uni");
  zrnFileClose(r);
}

// Without a status the run stops with the message on the user's screen.
TEST(ZrnErrors, WithoutStatusTheRunStopsNamingTheFile) {
  test::TempDir dir;
  const std::string missing = dir.file("gone.zrn0");
  EXPECT_EXIT(
      {
        dup2(2, 1);
        ZrnFile f;
        ZrnOpenInput(f, missing);
      },
      testing::ExitedWithCode(1), "ZRN open error on file: " + missing);
  EXPECT_EXIT(
      {
        dup2(2, 1);
        ZrnFile f;
        zrnFileRead(f, missing);
      },
      testing::ExitedWithCode(1), "ZRN Error: Unable to open ZRN file - file: " + missing);
  const std::string name = MakeSeries(dir, "s.zrn0", 1, 1);
  // A file that opens but is not usable is a numbered error, not an open error.
  EXPECT_EXIT(
      {
        dup2(2, 1);
        setenv("VX7F90_LOG_NOPATH", "1", 1);
        std::filesystem::copy_file(name, dir.file("s.zrnu"));
        ZrnFile f;
        ZrnOpenInput(f, dir.file("s.zrnu"));
      },
      testing::ExitedWithCode(1), "ZRN Error: Invalid type of ZRN file - file: s.zrnu");
}

}  // namespace
}  // namespace vhd
