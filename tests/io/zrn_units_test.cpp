// The unit library: keys, names, dimensions and conversions.

#include <gtest/gtest.h>

#include <cmath>

#include "io/units.hpp"

namespace vhd {
namespace {

TEST(ZrnUnits, KeysTheEngineRelyOn) {
  EXPECT_EQ(uvqGetUnitIdent(1000), "uvqUmeter");
  EXPECT_EQ(uvqGetUnitUdunits(1000), "m");
  EXPECT_EQ(uvqGetItemTypeIdent(100079), "uvqIBathymetry");
  EXPECT_EQ(uvqGetItemUserUnit(100079), 1000);
  EXPECT_EQ(uvqGetItemTypeIdent(999), "uvqIItemUndefined");
  EXPECT_TRUE(uvqItemUnitEqv(100007, 2200));   // concentration in g/m3
  EXPECT_TRUE(uvqItemUnitEqv(100201, 99000));  // component concentration, no unit
  EXPECT_FALSE(uvqItemUnitEqv(100201, 2200));
  EXPECT_EQ(uvqGetUnitIdent(77), "uvqUUnitUndefined");
  EXPECT_FALSE(uvqIsUnit(77));
}

TEST(ZrnUnits, EveryFlowQuantityHasAnSiDefaultOfItsOwnDimension) {
  const int types[] = {kUvqIWaterLevel,  kUvqIWaterDepth,     kUvqICurrentSpeed,  kUvqIFlowFlux,
                       kUvqIDischarge,   kUvqIConcentration,  kUvqITemperature,   kUvqISalinity,
                       kUvqIWindSpeed,   kUvqIWindDirection,  kUvqIPressure,      kUvqIPrecipitationRate,
                       kUvqIManningM,    kUvqIManningN,       kUvqIChezy,         kUvqIRoughnessHeight,
                       kUvqITimeScale,   kUvqICurrentDirection};
  for (int t : types) {
    ASSERT_TRUE(uvqIsItemType(t)) << t;
    const auto seq = uvqGetItemUnitSeq(t);
    ASSERT_FALSE(seq.empty()) << t;
    EXPECT_EQ(seq.front(), uvqGetItemUserUnit(t));
    for (int u : seq) EXPECT_TRUE(uvqItemUnitEqv(t, u)) << t << " " << u;
    EXPECT_FALSE(uvqGetUnitUdunits(seq.front()).empty()) << t;
    EXPECT_EQ(uvqGetItemTypeKey(uvqGetItemTypeIdent(t)), t);
    EXPECT_EQ(uvqGetItemTypeKey(uvqGetItemTypeName(t)), t);
  }
  EXPECT_FALSE(uvqItemUnitEqv(kUvqIWaterLevel, kUvqUmeterPerSec));
  EXPECT_FALSE(uvqItemUnitEqv(kUvqIManningM, kUvqUsecPerM1_3));
  EXPECT_TRUE(uvqItemUnitEqv(kUvqItemUndefined, kUvqUknot));
}

TEST(ZrnUnits, LookupByIdentNameAndUdunits) {
  EXPECT_EQ(uvqGetUnitKey("uvqUmeterPerSec"), kUvqUmeterPerSec);
  EXPECT_EQ(uvqGetUnitKey("m s-1"), kUvqUmeterPerSec);
  EXPECT_EQ(uvqGetUnitKey("m/s"), kUvqUmeterPerSec);
  EXPECT_EQ(uvqGetUnitKey(" degC "), kUvqUdegreeCelsius);
  EXPECT_EQ(uvqGetUnitKey("metres"), kUvqUmeter);
  EXPECT_EQ(uvqGetUnitKey("furlongs"), kUvqUnitUndefined);
  EXPECT_EQ(uvqGetItemTypeKey("water level"), kUvqIWaterLevel);
  EXPECT_EQ(uvqGetItemTypeKey("uvqIGeographicalCoordinate"), kUvqIGeographicalCoordinate);
  EXPECT_EQ(uvqGetItemTypeKey("nonsense"), kUvqItemUndefined);
}

TEST(ZrnUnits, ConversionsAreExactInverses) {
  double v = 10.0;
  ASSERT_EQ(uvqConvertUnit(kUvqUfeet, kUvqUmeter, v), 0);
  EXPECT_DOUBLE_EQ(v, 3.048);
  v = 100.0;
  ASSERT_EQ(uvqConvertUnit(kUvqUdegreeCelsius, kUvqUdegreeFahrenheit, v), 0);
  EXPECT_DOUBLE_EQ(v, 212.0);
  ASSERT_EQ(uvqConvertUnit(kUvqUdegreeFahrenheit, kUvqUkelvin, v), 0);
  EXPECT_DOUBLE_EQ(v, 373.15);
  ASSERT_EQ(uvqConvertUnit(kUvqUkelvin, kUvqUdegreeCelsius, v), 0);
  EXPECT_NEAR(v, 100.0, 1e-12);
  v = 86.4;  // mm/day -> m/s: divide by 86 400 000
  ASSERT_EQ(uvqConvertUnit(kUvqUmmPerDay, kUvqUmeterPerSec, v), 0);
  EXPECT_DOUBLE_EQ(v, 1e-6);
  v = 1.0;
  ASSERT_EQ(uvqConvertUnit(kUvqUknot, kUvqUkmPerHour, v), 0);
  EXPECT_DOUBLE_EQ(v, 1.852);
  double a[3] = {1.0, 2.0, 3.0};
  ASSERT_EQ(uvqConvertUnit(kUvqUhectopascal, kUvqUpascal, a, 3), 0);
  EXPECT_DOUBLE_EQ(a[2], 300.0);
  EXPECT_DOUBLE_EQ(uvqFromSI(kUvqUcentimeter, uvqToSI(kUvqUcentimeter, 42.0)), 42.0);
  // Across dimensions nothing changes.
  v = 5.0;
  EXPECT_EQ(uvqConvertUnit(kUvqUmeter, kUvqUsec, v), 1);
  EXPECT_EQ(v, 5.0);
  EXPECT_EQ(uvqConvertUnit(kUvqUmeter, 77, v), 1);
}

TEST(ZrnUnits, UnitTypeCheckMessage) {
  EXPECT_EQ(uvqCheckUnitType(kUvqIWaterLevel, kUvqIWaterLevel, kUvqUfeet), "");
  EXPECT_EQ(uvqCheckUnitType(kUvqIWindSpeed, kUvqItemUndefined, kUvqUknot), "");
  EXPECT_EQ(uvqCheckUnitType(kUvqIWindSpeed, kUvqIWaterLevel, kUvqUmeter),
            "The Item type: Water Level does not have the required unit type: m/s (Wind Speed), "
            "found m");
}

}  // namespace
}  // namespace vhd
