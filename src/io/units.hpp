#pragma once
// The unit library: item types and units with integer keys.
//
// An item type (water level, current speed, ...) belongs to one physical
// dimension and has a default unit, the unit the engine computes in (SI).
// A unit belongs to one dimension and converts to the dimension's SI unit by
//   value_si = value * factor + offset
// (offset only for temperatures). Each item type and unit has an identifier
// ("uvqIWaterLevel", "uvqUmeter"), a descriptive name ("Water Level", "m") and,
// for units, the UDUNITS string written to data files.
//
// Keys fixed by the engine: item type 999 undefined, unit 0 undefined,
// 100079 bed level (bathymetry), 100007 concentration, 100201 component
// concentration (non-dimensional), unit 1000 metre, 2200 gram per cubic metre,
// 99000 non-dimensional.

#include <string>
#include <string_view>
#include <vector>

namespace vhd {

inline constexpr int kUvqItemUndefined = 999;
inline constexpr int kUvqUnitUndefined = 0;

// Item types.
inline constexpr int kUvqIWaterLevel = 100000;
inline constexpr int kUvqIWaterDepth = 100001;
inline constexpr int kUvqICurrentSpeed = 100002;
inline constexpr int kUvqICurrentDirection = 100003;
inline constexpr int kUvqIWindSpeed = 100004;
inline constexpr int kUvqIWindDirection = 100005;
inline constexpr int kUvqIPrecipitationRate = 100006;
inline constexpr int kUvqIConcentration = 100007;
inline constexpr int kUvqITemperature = 100008;
inline constexpr int kUvqISalinity = 100009;
inline constexpr int kUvqIDischarge = 100010;
inline constexpr int kUvqIFlowFlux = 100011;          // flux per unit width, m2/s
inline constexpr int kUvqIPressure = 100012;
inline constexpr int kUvqIManningM = 100013;
inline constexpr int kUvqIManningN = 100014;
inline constexpr int kUvqIChezy = 100015;
inline constexpr int kUvqIRoughnessHeight = 100016;
inline constexpr int kUvqITimeScale = 100017;
inline constexpr int kUvqIAngle = 100018;
inline constexpr int kUvqIGeographicalCoordinate = 100019;
inline constexpr int kUvqILatLong = 100020;
inline constexpr int kUvqIUVelocity = 100021;
inline constexpr int kUvqIVVelocity = 100022;
inline constexpr int kUvqIEvaporationRate = 100023;
inline constexpr int kUvqIDecayRate = 100024;
inline constexpr int kUvqIEddyViscosity = 100025;
inline constexpr int kUvqIAirTemperature = 100026;
inline constexpr int kUvqIRelativeHumidity = 100027;
inline constexpr int kUvqIHeatFlux = 100028;
inline constexpr int kUvqIDensity = 100029;
inline constexpr int kUvqIMass = 100030;
inline constexpr int kUvqIAirPressure = 100031;
inline constexpr int kUvqIVolume = 100032;
inline constexpr int kUvqIArea = 100033;
inline constexpr int kUvqIBedLoad = 100034;           // volume per width and time, m2/s
inline constexpr int kUvqIPartition = 100035;         // sub-domain number
inline constexpr int kUvqIBathymetry = 100079;        // bed level
inline constexpr int kUvqIComponentConcentration = 100201;

// Units.
inline constexpr int kUvqUmeter = 1000;
inline constexpr int kUvqUkilometer = 1001;
inline constexpr int kUvqUmillimeter = 1002;
inline constexpr int kUvqUcentimeter = 1003;
inline constexpr int kUvqUfeet = 1014;
inline constexpr int kUvqUsec = 1400;
inline constexpr int kUvqUminute = 1401;
inline constexpr int kUvqUhour = 1402;
inline constexpr int kUvqUday = 1403;
inline constexpr int kUvqUkilogram = 1200;
inline constexpr int kUvqUgram = 1201;
inline constexpr int kUvqUtonne = 1202;
inline constexpr int kUvqUm3 = 1600;
inline constexpr int kUvqUliter = 1601;
inline constexpr int kUvqUm3PerSec = 1800;
inline constexpr int kUvqUliterPerSec = 1801;
inline constexpr int kUvqUft3PerSec = 1802;
inline constexpr int kUvqUmeterPerSec = 2000;
inline constexpr int kUvqUkmPerHour = 2001;
inline constexpr int kUvqUknot = 2002;
inline constexpr int kUvqUcmPerSec = 2003;
inline constexpr int kUvqUftPerSec = 2004;
inline constexpr int kUvqUmmPerDay = 2005;
inline constexpr int kUvqUmmPerHour = 2006;
inline constexpr int kUvqUgPerM3 = 2200;
inline constexpr int kUvqUkgPerM3 = 2201;
inline constexpr int kUvqUmgPerLiter = 2202;
inline constexpr int kUvqUmicrogPerLiter = 2203;
inline constexpr int kUvqUdegree = 2400;
inline constexpr int kUvqUradian = 2401;
inline constexpr int kUvqUperSec = 2600;
inline constexpr int kUvqUperDay = 2601;
inline constexpr int kUvqUdegreeCelsius = 2800;
inline constexpr int kUvqUdegreeFahrenheit = 2801;
inline constexpr int kUvqUkelvin = 2802;
inline constexpr int kUvqUm2 = 3200;
inline constexpr int kUvqUkm2 = 3201;
inline constexpr int kUvqUhectare = 3202;
inline constexpr int kUvqUm2PerSec = 4700;
inline constexpr int kUvqUft2PerSec = 4701;
inline constexpr int kUvqUm1_3PerSec = 4900;     // Manning M, m^(1/3)/s
inline constexpr int kUvqUsecPerM1_3 = 4950;     // Manning n, s/m^(1/3)
inline constexpr int kUvqUm1_2PerSec = 5000;     // Chezy, m^(1/2)/s
inline constexpr int kUvqUpascal = 5600;
inline constexpr int kUvqUhectopascal = 5601;
inline constexpr int kUvqUkilopascal = 5602;
inline constexpr int kUvqUmillibar = 5603;
inline constexpr int kUvqUbar = 5604;
inline constexpr int kUvqUwattPerM2 = 5700;
inline constexpr int kUvqUpsu = 6200;
inline constexpr int kUvqUpermille = 6201;
inline constexpr int kUvqUnonDim = 99000;
inline constexpr int kUvqUpercent = 99001;

// Key of an item type from its identifier ("uvqIWaterLevel") or name
// ("Water Level", case-insensitive); kUvqItemUndefined when unknown.
int uvqGetItemTypeKey(std::string_view ident_or_name);
// Key of a unit from its identifier ("uvqUmeter"), name ("m") or UDUNITS
// string ("m s-1"); kUvqUnitUndefined when unknown.
int uvqGetUnitKey(std::string_view ident_or_name);
// The units of an item type's dimension, its default unit first.
std::vector<int> uvqGetItemUnitSeq(int item_type);
// True when the unit belongs to the dimension of the item type (the undefined
// item type accepts every unit).
bool uvqItemUnitEqv(int item_type, int unit);
// Converts values from one unit to another of the same dimension. Returns 0,
// or 1 (values untouched) when the units are unknown or of other dimensions.
int uvqConvertUnit(int from_unit, int to_unit, double& value);
int uvqConvertUnit(int from_unit, int to_unit, double* values, long n);
// Converts to and from the SI unit of the unit's dimension.
double uvqToSI(int unit, double value);
double uvqFromSI(int unit, double value);
// The unit the engine computes in for an item type (its default unit).
int uvqGetItemUserUnit(int item_type);
std::string uvqGetItemTypeIdent(int item_type);  // "uvqIItemUndefined" when unknown
std::string uvqGetUnitIdent(int unit);           // "uvqUUnitUndefined" when unknown
std::string uvqGetItemTypeName(int item_type);   // "Undefined" when unknown
std::string uvqGetUnitName(int unit);            // short name, "undefined" when unknown
std::string uvqGetUnitUdunits(int unit);         // UDUNITS string, "" when unknown
bool uvqIsItemType(int item_type);
bool uvqIsUnit(int unit);
// Checks an input item (its item type and unit) against the item type the
// caller requires: the unit must belong to the required type's dimension.
// Returns "" when it fits, else the message "The Item type: <the item's type
// name> does not have the required unit type: <the required type's default
// unit> (<required type name>), found <unit name>".
std::string uvqCheckUnitType(int required_item_type, int item_type, int unit);

}  // namespace vhd
