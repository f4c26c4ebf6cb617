#include "io/units.hpp"

#include <algorithm>
#include <cctype>

namespace vhd {
namespace {

// Physical dimensions; each unit and item type belongs to one.
enum class Dim {
  Any, NonDim, Length, Time, Mass, Volume, Area, Discharge, Velocity, Concentration, Angle,
  Rate, Temperature, Flux, ManningM, ManningN, Chezy, Pressure, HeatFlux, Salinity
};

struct UnitDef {
  int key;
  const char* ident;
  const char* name;
  const char* udunits;
  Dim dim;
  double factor;  // value_si = value * factor + offset
  double offset;
};

struct ItemDef {
  int key;
  const char* ident;
  const char* name;
  Dim dim;
  int unit;  // default unit: the unit the engine computes in
};

constexpr UnitDef kUnits[] = {
    {kUvqUnitUndefined, "uvqUUnitUndefined", "undefined", "", Dim::Any, 1.0, 0.0},
    {kUvqUmeter, "uvqUmeter", "m", "m", Dim::Length, 1.0, 0.0},
    {kUvqUkilometer, "uvqUkilometer", "km", "km", Dim::Length, 1000.0, 0.0},
    {kUvqUmillimeter, "uvqUmillimeter", "mm", "mm", Dim::Length, 1e-3, 0.0},
    {kUvqUcentimeter, "uvqUcentimeter", "cm", "cm", Dim::Length, 1e-2, 0.0},
    {kUvqUfeet, "uvqUfeet", "ft", "ft", Dim::Length, 0.3048, 0.0},
    {kUvqUsec, "uvqUsec", "s", "s", Dim::Time, 1.0, 0.0},
    {kUvqUminute, "uvqUminute", "min", "min", Dim::Time, 60.0, 0.0},
    {kUvqUhour, "uvqUhour", "hour", "h", Dim::Time, 3600.0, 0.0},
    {kUvqUday, "uvqUday", "day", "d", Dim::Time, 86400.0, 0.0},
    {kUvqUkilogram, "uvqUkilogram", "kg", "kg", Dim::Mass, 1.0, 0.0},
    {kUvqUgram, "uvqUgram", "g", "g", Dim::Mass, 1e-3, 0.0},
    {kUvqUtonne, "uvqUtonne", "t", "t", Dim::Mass, 1000.0, 0.0},
    {kUvqUm3, "uvqUm3", "m^3", "m3", Dim::Volume, 1.0, 0.0},
    {kUvqUliter, "uvqUliter", "l", "L", Dim::Volume, 1e-3, 0.0},
    {kUvqUm2, "uvqUm2", "m^2", "m2", Dim::Area, 1.0, 0.0},
    {kUvqUkm2, "uvqUkm2", "km^2", "km2", Dim::Area, 1e6, 0.0},
    {kUvqUhectare, "uvqUhectare", "ha", "hectare", Dim::Area, 1e4, 0.0},
    {kUvqUm3PerSec, "uvqUm3PerSec", "m^3/s", "m3 s-1", Dim::Discharge, 1.0, 0.0},
    {kUvqUliterPerSec, "uvqUliterPerSec", "l/s", "L s-1", Dim::Discharge, 1e-3, 0.0},
    {kUvqUft3PerSec, "uvqUft3PerSec", "ft^3/s", "ft3 s-1", Dim::Discharge, 0.028316846592, 0.0},
    {kUvqUmeterPerSec, "uvqUmeterPerSec", "m/s", "m s-1", Dim::Velocity, 1.0, 0.0},
    {kUvqUkmPerHour, "uvqUkmPerHour", "km/h", "km h-1", Dim::Velocity, 1000.0 / 3600.0, 0.0},
    {kUvqUknot, "uvqUknot", "knot", "knot", Dim::Velocity, 1852.0 / 3600.0, 0.0},
    {kUvqUcmPerSec, "uvqUcmPerSec", "cm/s", "cm s-1", Dim::Velocity, 1e-2, 0.0},
    {kUvqUftPerSec, "uvqUftPerSec", "ft/s", "ft s-1", Dim::Velocity, 0.3048, 0.0},
    {kUvqUmmPerDay, "uvqUmmPerDay", "mm/day", "mm d-1", Dim::Velocity, 1e-3 / 86400.0, 0.0},
    {kUvqUmmPerHour, "uvqUmmPerHour", "mm/hour", "mm h-1", Dim::Velocity, 1e-3 / 3600.0, 0.0},
    {kUvqUgPerM3, "uvqUgPerM3", "g/m^3", "g m-3", Dim::Concentration, 1e-3, 0.0},
    {kUvqUkgPerM3, "uvqUkgPerM3", "kg/m^3", "kg m-3", Dim::Concentration, 1.0, 0.0},
    {kUvqUmgPerLiter, "uvqUmgPerLiter", "mg/l", "mg L-1", Dim::Concentration, 1e-3, 0.0},
    {kUvqUmicrogPerLiter, "uvqUmicrogPerLiter", "ug/l", "ug L-1", Dim::Concentration, 1e-6, 0.0},
    {kUvqUdegree, "uvqUdegree", "degree", "degree", Dim::Angle, 1.0, 0.0},
    {kUvqUradian, "uvqUradian", "radian", "rad", Dim::Angle, 57.29577951308232, 0.0},
    {kUvqUperSec, "uvqUperSec", "1/s", "s-1", Dim::Rate, 1.0, 0.0},
    {kUvqUperDay, "uvqUperDay", "1/day", "d-1", Dim::Rate, 1.0 / 86400.0, 0.0},
    {kUvqUdegreeCelsius, "uvqUdegreeCelsius", "deg C", "degC", Dim::Temperature, 1.0, 0.0},
    {kUvqUdegreeFahrenheit, "uvqUdegreeFahrenheit", "deg F", "degF", Dim::Temperature,
     5.0 / 9.0, -32.0 * 5.0 / 9.0},
    {kUvqUkelvin, "uvqUkelvin", "K", "K", Dim::Temperature, 1.0, -273.15},
    {kUvqUm2PerSec, "uvqUm2PerSec", "m^2/s", "m2 s-1", Dim::Flux, 1.0, 0.0},
    {kUvqUft2PerSec, "uvqUft2PerSec", "ft^2/s", "ft2 s-1", Dim::Flux, 0.09290304, 0.0},
    {kUvqUm1_3PerSec, "uvqUm1_3PerSec", "m^(1/3)/s", "m(1/3) s-1", Dim::ManningM, 1.0, 0.0},
    {kUvqUsecPerM1_3, "uvqUsecPerM1_3", "s/m^(1/3)", "s m-(1/3)", Dim::ManningN, 1.0, 0.0},
    {kUvqUm1_2PerSec, "uvqUm1_2PerSec", "m^(1/2)/s", "m(1/2) s-1", Dim::Chezy, 1.0, 0.0},
    {kUvqUpascal, "uvqUpascal", "Pa", "Pa", Dim::Pressure, 1.0, 0.0},
    {kUvqUhectopascal, "uvqUhectopascal", "hPa", "hPa", Dim::Pressure, 100.0, 0.0},
    {kUvqUkilopascal, "uvqUkilopascal", "kPa", "kPa", Dim::Pressure, 1000.0, 0.0},
    {kUvqUmillibar, "uvqUmillibar", "mbar", "mbar", Dim::Pressure, 100.0, 0.0},
    {kUvqUbar, "uvqUbar", "bar", "bar", Dim::Pressure, 1e5, 0.0},
    {kUvqUwattPerM2, "uvqUwattPerM2", "W/m^2", "W m-2", Dim::HeatFlux, 1.0, 0.0},
    {kUvqUpsu, "uvqUpsu", "PSU", "1e-3", Dim::Salinity, 1.0, 0.0},
    {kUvqUpermille, "uvqUpermille", "per mille", "permille", Dim::Salinity, 1.0, 0.0},
    {kUvqUnonDim, "uvqUnonDim", "()", "1", Dim::NonDim, 1.0, 0.0},
    {kUvqUpercent, "uvqUpercent", "%", "percent", Dim::NonDim, 0.01, 0.0},
};

constexpr ItemDef kItems[] = {
    {kUvqItemUndefined, "uvqIItemUndefined", "Undefined", Dim::Any, kUvqUnitUndefined},
    {kUvqIWaterLevel, "uvqIWaterLevel", "Water Level", Dim::Length, kUvqUmeter},
    {kUvqIWaterDepth, "uvqIWaterDepth", "Water Depth", Dim::Length, kUvqUmeter},
    {kUvqICurrentSpeed, "uvqICurrentSpeed", "Current Speed", Dim::Velocity, kUvqUmeterPerSec},
    {kUvqICurrentDirection, "uvqICurrentDirection", "Current Direction", Dim::Angle, kUvqUdegree},
    {kUvqIWindSpeed, "uvqIWindSpeed", "Wind Speed", Dim::Velocity, kUvqUmeterPerSec},
    {kUvqIWindDirection, "uvqIWindDirection", "Wind Direction", Dim::Angle, kUvqUdegree},
    {kUvqIPrecipitationRate, "uvqIPrecipitationRate", "Precipitation Rate", Dim::Velocity,
     kUvqUmmPerDay},
    {kUvqIConcentration, "uvqIConcentration", "Concentration", Dim::Concentration, kUvqUgPerM3},
    {kUvqITemperature, "uvqITemperature", "Temperature", Dim::Temperature, kUvqUdegreeCelsius},
    {kUvqISalinity, "uvqISalinity", "Salinity", Dim::Salinity, kUvqUpsu},
    {kUvqIDischarge, "uvqIDischarge", "Discharge", Dim::Discharge, kUvqUm3PerSec},
    {kUvqIFlowFlux, "uvqIFlowFlux", "Flow Flux", Dim::Flux, kUvqUm2PerSec},
    {kUvqIPressure, "uvqIPressure", "Pressure", Dim::Pressure, kUvqUpascal},
    {kUvqIManningM, "uvqIManningM", "Manning's M", Dim::ManningM, kUvqUm1_3PerSec},
    {kUvqIManningN, "uvqIManningN", "Manning's n", Dim::ManningN, kUvqUsecPerM1_3},
    {kUvqIChezy, "uvqIChezy", "Chezy No", Dim::Chezy, kUvqUm1_2PerSec},
    {kUvqIRoughnessHeight, "uvqIRoughnessHeight", "Roughness Height", Dim::Length, kUvqUmeter},
    {kUvqITimeScale, "uvqITimeScale", "Time Scale", Dim::Time, kUvqUsec},
    {kUvqIAngle, "uvqIAngle", "Angle", Dim::Angle, kUvqUdegree},
    {kUvqIGeographicalCoordinate, "uvqIGeographicalCoordinate", "Geographical Coordinate",
     Dim::Length, kUvqUmeter},
    {kUvqILatLong, "uvqILatLong", "Lat/Long", Dim::Angle, kUvqUdegree},
    {kUvqIUVelocity, "uvqIUVelocity", "U Velocity", Dim::Velocity, kUvqUmeterPerSec},
    {kUvqIVVelocity, "uvqIVVelocity", "V Velocity", Dim::Velocity, kUvqUmeterPerSec},
    {kUvqIEvaporationRate, "uvqIEvaporationRate", "Evaporation Rate", Dim::Velocity,
     kUvqUmmPerDay},
    {kUvqIDecayRate, "uvqIDecayRate", "Decay Rate", Dim::Rate, kUvqUperSec},
    {kUvqIEddyViscosity, "uvqIEddyViscosity", "Eddy Viscosity", Dim::Flux, kUvqUm2PerSec},
    {kUvqIAirTemperature, "uvqIAirTemperature", "Air Temperature", Dim::Temperature,
     kUvqUdegreeCelsius},
    {kUvqIRelativeHumidity, "uvqIRelativeHumidity", "Relative Humidity", Dim::NonDim,
     kUvqUpercent},
    {kUvqIHeatFlux, "uvqIHeatFlux", "Heat Flux", Dim::HeatFlux, kUvqUwattPerM2},
    {kUvqIDensity, "uvqIDensity", "Density", Dim::Concentration, kUvqUkgPerM3},
    {kUvqIMass, "uvqIMass", "Mass", Dim::Mass, kUvqUkilogram},
    {kUvqIAirPressure, "uvqIAirPressure", "Air Pressure", Dim::Pressure, kUvqUhectopascal},
    {kUvqIVolume, "uvqIVolume", "Volume", Dim::Volume, kUvqUm3},
    {kUvqIArea, "uvqIArea", "Area", Dim::Area, kUvqUm2},
    {kUvqIBedLoad, "uvqIBedLoad", "Bed Load", Dim::Flux, kUvqUm2PerSec},
    {kUvqIPartition, "uvqIPartition", "Partition", Dim::NonDim, kUvqUnonDim},
    {kUvqIBathymetry, "uvqIBathymetry", "Bathymetry", Dim::Length, kUvqUmeter},
    {kUvqIComponentConcentration, "uvqIComponentConcentration", "Component Concentration",
     Dim::NonDim, kUvqUnonDim},
};

// Other spellings of UDUNITS strings met in files written by other tools.
struct Alias {
  const char* text;
  int unit;
};
constexpr Alias kAliases[] = {
    {"meter", kUvqUmeter},         {"meters", kUvqUmeter},        {"metre", kUvqUmeter},
    {"metres", kUvqUmeter},        {"m/s", kUvqUmeterPerSec},     {"m s**-1", kUvqUmeterPerSec},
    {"m.s-1", kUvqUmeterPerSec},   {"m3/s", kUvqUm3PerSec},       {"m^3/s", kUvqUm3PerSec},
    {"m3.s-1", kUvqUm3PerSec},     {"m2/s", kUvqUm2PerSec},       {"degrees", kUvqUdegree},
    {"deg", kUvqUdegree},          {"degree_north", kUvqUdegree}, {"degrees_north", kUvqUdegree},
    {"degree_east", kUvqUdegree},  {"degrees_east", kUvqUdegree}, {"degree_Celsius", kUvqUdegreeCelsius},
    {"degrees_Celsius", kUvqUdegreeCelsius}, {"celsius", kUvqUdegreeCelsius},
    {"Kelvin", kUvqUkelvin},       {"kg/m3", kUvqUkgPerM3},       {"g/m3", kUvqUgPerM3},
    {"mg/l", kUvqUmgPerLiter},     {"mm/day", kUvqUmmPerDay},     {"mm/h", kUvqUmmPerHour},
    {"mm/hr", kUvqUmmPerHour},     {"seconds", kUvqUsec},         {"second", kUvqUsec},
    {"sec", kUvqUsec},             {"hours", kUvqUhour},          {"days", kUvqUday},
    {"psu", kUvqUpsu},             {"PSU", kUvqUpsu},             {"0.001", kUvqUpsu},
    {"%", kUvqUpercent},           {"W/m2", kUvqUwattPerM2},      {"1/s", kUvqUperSec},
    {"-", kUvqUnonDim},            {"", kUvqUnitUndefined},
};

const UnitDef* FindUnit(int key) {
  for (const auto& u : kUnits)
    if (u.key == key) return &u;
  return nullptr;
}

const ItemDef* FindItem(int key) {
  for (const auto& it : kItems)
    if (it.key == key) return &it;
  return nullptr;
}

bool EqualNoCase(std::string_view a, std::string_view b) {
  if (a.size() != b.size()) return false;
  for (std::size_t i = 0; i < a.size(); ++i)
    if (std::tolower(static_cast<unsigned char>(a[i])) !=
        std::tolower(static_cast<unsigned char>(b[i])))
      return false;
  return true;
}

std::string_view Trim(std::string_view s) {
  while (!s.empty() && std::isspace(static_cast<unsigned char>(s.front()))) s.remove_prefix(1);
  while (!s.empty() && std::isspace(static_cast<unsigned char>(s.back()))) s.remove_suffix(1);
  return s;
}

}  // namespace

int uvqGetItemTypeKey(std::string_view ident_or_name) {
  const std::string_view s = Trim(ident_or_name);
  for (const auto& it : kItems)
    if (s == it.ident || EqualNoCase(s, it.name)) return it.key;
  for (const auto& it : kItems)
    if (EqualNoCase(s, it.ident)) return it.key;
  return kUvqItemUndefined;
}

int uvqGetUnitKey(std::string_view ident_or_name) {
  const std::string_view s = Trim(ident_or_name);
  // Exact spellings first: "K" and "k", "Pa" and "pa" are different units.
  for (const auto& u : kUnits)
    if (s == u.ident || s == u.name || (u.udunits[0] != '\0' && s == u.udunits)) return u.key;
  for (const auto& a : kAliases)
    if (s == a.text) return a.unit;
  for (const auto& u : kUnits)
    if (EqualNoCase(s, u.ident)) return u.key;
  for (const auto& a : kAliases)
    if (EqualNoCase(s, a.text)) return a.unit;
  return kUvqUnitUndefined;
}

std::vector<int> uvqGetItemUnitSeq(int item_type) {
  std::vector<int> seq;
  const ItemDef* it = FindItem(item_type);
  if (it == nullptr) return seq;
  seq.push_back(it->unit);
  for (const auto& u : kUnits)
    if (u.key != it->unit && (it->dim == Dim::Any || u.dim == it->dim)) seq.push_back(u.key);
  return seq;
}

bool uvqItemUnitEqv(int item_type, int unit) {
  const ItemDef* it = FindItem(item_type);
  const UnitDef* u = FindUnit(unit);
  if (it == nullptr || u == nullptr) return false;
  return it->dim == Dim::Any || u->dim == it->dim;
}

double uvqToSI(int unit, double value) {
  const UnitDef* u = FindUnit(unit);
  return u == nullptr ? value : value * u->factor + u->offset;
}

double uvqFromSI(int unit, double value) {
  const UnitDef* u = FindUnit(unit);
  return u == nullptr ? value : (value - u->offset) / u->factor;
}

int uvqConvertUnit(int from_unit, int to_unit, double* values, long n) {
  if (from_unit == to_unit) return 0;
  const UnitDef* a = FindUnit(from_unit);
  const UnitDef* b = FindUnit(to_unit);
  if (a == nullptr || b == nullptr || a->dim != b->dim || a->dim == Dim::Any) return 1;
  // One linear map: v_b = v_a * scale + shift.
  const double scale = a->factor / b->factor;
  const double shift = (a->offset - b->offset) / b->factor;
  for (long i = 0; i < n; ++i) values[i] = values[i] * scale + shift;
  return 0;
}

int uvqConvertUnit(int from_unit, int to_unit, double& value) {
  return uvqConvertUnit(from_unit, to_unit, &value, 1);
}

int uvqGetItemUserUnit(int item_type) {
  const ItemDef* it = FindItem(item_type);
  return it == nullptr ? kUvqUnitUndefined : it->unit;
}

std::string uvqGetItemTypeIdent(int item_type) {
  const ItemDef* it = FindItem(item_type);
  return it == nullptr ? "uvqIItemUndefined" : it->ident;
}

std::string uvqGetUnitIdent(int unit) {
  const UnitDef* u = FindUnit(unit);
  return u == nullptr ? "uvqUUnitUndefined" : u->ident;
}

std::string uvqGetItemTypeName(int item_type) {
  const ItemDef* it = FindItem(item_type);
  return it == nullptr ? "Undefined" : it->name;
}

std::string uvqGetUnitName(int unit) {
  const UnitDef* u = FindUnit(unit);
  return u == nullptr ? "undefined" : u->name;
}

std::string uvqGetUnitUdunits(int unit) {
  const UnitDef* u = FindUnit(unit);
  return u == nullptr ? "" : u->udunits;
}

bool uvqIsItemType(int item_type) { return FindItem(item_type) != nullptr; }
bool uvqIsUnit(int unit) { return FindUnit(unit) != nullptr; }

std::string uvqCheckUnitType(int required_item_type, int item_type, int unit) {
  if (uvqItemUnitEqv(required_item_type, unit)) return "";
  return "The Item type: " + uvqGetItemTypeName(item_type) +
         " does not have the required unit type: " +
         uvqGetUnitName(uvqGetItemUserUnit(required_item_type)) + " (" +
         uvqGetItemTypeName(required_item_type) + "), found " + uvqGetUnitName(unit);
}

}  // namespace vhd
