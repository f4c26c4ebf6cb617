// Tidal potential (UPDATETIDE of PROPERTYTIDE): the equilibrium tide of each
// element from tidal constituents (given in the setup file or the six
// built-in ones) or read from a data file.
//
// Time: T = (t / 86400 + d0) / 36525 Julian centuries, d0 the simulation
// start in days from the epoch 1899-12-31 12:00 of the mean longitudes of
// the Sun h, the Moon s, the lunar perigee p and the Moon's ascending node N.
// The built-in constituents take V0 + u of the start and their nodal factors
// f at the time of each update; no earth-tide factor is applied to them.

#include <cmath>
#include <numbers>

#include "core/omp.hpp"
#include "hydro/forcing.hpp"
#include "hydro/hd_module.hpp"
#include "log/log.hpp"
#include "mesh/femdata.hpp"

namespace vhd {

namespace {

constexpr double kDeg = std::numbers::pi / 180.0;

// Days from 0000-03-01 of the proleptic Gregorian calendar to a date.
long DaysFromCivil(int y, int m, int d) {
  y -= m <= 2 ? 1 : 0;
  const long era = (y >= 0 ? y : y - 399) / 400;
  const long yoe = y - era * 400;
  const long doy = (153L * (m + (m > 2 ? -3 : 9)) + 2) / 5 + d - 1;
  const long doe = yoe * 365 + yoe / 4 - yoe / 100 + doy;
  return era * 146097 + doe;
}

struct BuiltinRow {
  const char* name;
  int species;
  double amplitude;  // m
  double omega;      // rad/s
};

constexpr BuiltinRow kBuiltin[6] = {
    {"M2", 2, 0.242334, 1.4051890250864362e-4}, {"S2", 2, 0.113033, 1.454441043328608e-4},
    {"N2", 2, 0.046398, 1.3787970041036562e-4}, {"K2", 2, 0.030704, 1.4584231720055478e-4},
    {"K1", 1, 0.141565, 7.29211604462623e-5},   {"O1", 1, 0.100514, 6.759774185145898e-5},
};

}  // namespace

double DaysFromTideEpoch(int year, int month, int day, int hour, int minute, double second) {
  const double days = static_cast<double>(DaysFromCivil(year, month, day) - DaysFromCivil(1899, 12, 31));
  return days - 0.5 + (hour + (minute + second / 60.0) / 60.0) / 24.0;
}

double LunarNodeDegrees(int type, double T) {
  if (type == 1) return 259.16 - 1934.14 * T + 0.0021 * T * T;
  return 259.1600036621094 - 1934.1424560546875 * T + 0.0021059999708086252 * T * T +
         2.221999920948292e-6 * T * T * T;
}

double BuiltinNodalFactor(int k, double N) {
  switch (k) {
    case 0:
    case 2:
      return 1.0 - 0.037 * std::cos(N);
    case 1:
      return 1.0;
    case 3:
      return 1.024 + 0.286 * std::cos(N) + 0.008 * std::cos(2.0 * N);
    case 4:
      return 1.006 + 0.115 * std::cos(N) - 0.009 * std::cos(2.0 * N);
    default:
      return 1.009 + 0.187 * std::cos(N) - 0.015 * std::cos(2.0 * N);
  }
}

std::vector<TidalConstituent> BuiltinConstituents(double T) {
  const double h = 280.19 + 36000.76953125 * T + 0.000303 * T * T;
  const double s = 277.03 + 481267.90625 * T + 0.002525 * T * T + 1.889e-6 * T * T * T;
  const double p = 334.38 + 4069.033935546875 * T - 0.010325 * T * T - 1.2e-5 * T * T * T;
  const double N = LunarNodeDegrees(3, T) * kDeg;
  const double sN = std::sin(N), s2N = std::sin(2.0 * N), s3N = std::sin(3.0 * N);
  const double v0u[6] = {
      2 * h - 2 * s - 2.1 * sN,
      0.0,
      2 * h - 3 * s + p - 2.1 * sN,
      2 * h - 17.7 * sN + 0.7 * s2N,
      h + 90 - 8.9 * sN + 0.7 * s2N,
      h - 2 * s - 90 + 10.8 * sN - 1.3 * s2N + 0.2 * s3N,
  };
  std::vector<TidalConstituent> list(6);
  for (int k = 0; k < 6; ++k) {
    TidalConstituent& c = list[static_cast<std::size_t>(k)];
    c.name = kBuiltin[k].name;
    c.species = kBuiltin[k].species;
    c.amplitude = kBuiltin[k].amplitude;
    c.omega = kBuiltin[k].omega;
    c.period = 2.0 * std::numbers::pi / c.omega;
    c.v0u = std::remainder(v0u[k], 360.0) * kDeg;
  }
  return list;
}

double TideLatitudeFunction(int species, double lat) {
  const double s = std::sin(lat), c = std::cos(lat);
  if (species == 0) return 3.0 * s * s - 1.0;
  if (species == 1) return 2.0 * s * c;
  return c * c;
}

void UPDATETIDE(HdModule& hd, double t) {
  HdTidalPotential& tp = hd.forcing.tide;
  HdState& st = hd.state;
  const int nown = st.nelements_owned;
  if (tp.type == 2) {
    FemDataRead(tp.data, 1, t, tp.eta_eq);
    // No equilibrium tide where the file holds no value.
    const double del = tp.data.state.open ? tp.data.state.file.delete_value : kZrnDefaultDeleteValue;
    for (int e = 1; e <= nown; ++e) {
      if (tp.eta_eq[e] == del || !std::isfinite(tp.eta_eq[e])) tp.eta_eq[e] = 0.0;
    }
  } else if (tp.type == 1 || tp.type == 3) {
    // Arguments and amplitude factors once per update.
    const double T = (t / 86400.0 + tp.start_days) / 36525.0;
    const double N = LunarNodeDegrees(tp.type, T) * kDeg;
    for (std::size_t k = 0; k < tp.constituents.size(); ++k) {
      const TidalConstituent& c = tp.constituents[k];
      if (tp.type == 1) {
        tp.arg[k] = 2.0 * std::numbers::pi * t / c.period + c.phase * kDeg;
        tp.amp[k] = c.amplitude * c.earthtide * (c.nodal_number_1 + c.nodal_number_2 * std::cos(N));
      } else {
        tp.arg[k] = c.omega * t + c.v0u;
        tp.amp[k] = c.amplitude * BuiltinNodalFactor(static_cast<int>(k), N);
      }
    }
    const int nk = static_cast<int>(tp.constituents.size());
    const TidalConstituent* con = tp.constituents.data();
    const double *amp = tp.amp.data(), *arg = tp.arg.data();
    VHD_OMP_PARALLEL_FOR
    for (int e = 1; e <= nown; ++e) {
      const double lat = tp.lat[e], lon = tp.lon[e];
      double sum = 0.0;
      for (int k = 0; k < nk; ++k) {
        sum += amp[k] * TideLatitudeFunction(con[k].species, lat) * std::cos(con[k].species * lon + arg[k]);
      }
      tp.eta_eq[e] = sum;
    }
  } else {
    FatalError("Format not supported for tide conditions (tidal potential type " + std::to_string(tp.type) + ")");
  }
  if (hd.subdomain) ExchangeHalo(*hd.subdomain, {&tp.eta_eq});
}

}  // namespace vhd
