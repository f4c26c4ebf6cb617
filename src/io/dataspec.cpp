// Time-varying input data: reading an input definition, the soft start,
// interpolation in time, the coverage check and the table lookup.

#include "io/dataspec.hpp"

#include <algorithm>
#include <cmath>
#include <numbers>

#include "io/setup.hpp"
#include "log/log.hpp"

namespace vhd {

void InitDataSpec(DataSpec& spec, int n, const std::vector<double>& default_values,
                  const std::vector<int>& default_items) {
  if (n < 1) FatalError("InitDataSpec: number of components must be >= 1");
  spec.format = kDataConstant;
  spec.n = n;
  spec.constant_values.assign(n, 0.0);
  spec.item_numbers.assign(n, 0);
  for (int k = 1; k <= n; ++k) {
    const auto j = static_cast<std::size_t>(k - 1);
    spec.constant_values[k] = j < default_values.size() ? default_values[j] : 0.0;
    spec.item_numbers[k] = j < default_items.size() ? default_items[j] : k;
  }
  spec.file_name.clear();
  spec.no_soft_start.assign(n, 0);
  spec.type_of_soft_start = kSoftStartSine;
  spec.soft_time_interval = 0.0;
  spec.reference_values.assign(n, 0.0);
  spec.time_interpolation.assign(n, kTimeInterpolationLinear);
  spec.type_of_space_interpolation = 0;
}

namespace {

// Reads a keyword of n doubles into components 1..n: the singular form with
// one value when n = 1, the plural form with n values otherwise.
void ReadComponents(const char* singular, const char* plural, Array1<double>& values) {
  const int n = values.size();
  if (n == 1) {
    SktReadKeyword(singular, values[1], values[1]);
    return;
  }
  std::vector<double> v(values.begin(), values.end());
  SktReadKeyword(plural, v, n, std::vector<double>(v));
  std::copy(v.begin(), v.end(), values.begin());
}

void ReadComponents(const char* singular, const char* plural, Array1<int>& values) {
  const int n = values.size();
  if (n == 1) {
    SktReadKeyword(singular, values[1], values[1]);
    return;
  }
  std::vector<int> v(values.begin(), values.end());
  SktReadKeyword(plural, v, n, std::vector<int>(v));
  std::copy(v.begin(), v.end(), values.begin());
}

void ReadFileName(DataSpec& spec) {
  int flag = 0;
  SktReadFileName("file_name", spec.file_name, std::nullopt, SktArg{.flag = &flag});
  if (flag != 0 || spec.file_name.empty())
    StopRun("Missing data file name: keyword file_name in section " + SktSectionPath());
}

}  // namespace

void ReadDataSpec(DataSpec& spec, int n, const std::vector<double>& default_values,
                  const std::vector<int>& default_items) {
  ReadDataSpec(spec, n, {}, std::string(), default_values, default_items);
}

void ReadDataSpec(DataSpec& spec, int n, std::span<const int> formats, const std::string& format_message,
                  const std::vector<double>& default_values, const std::vector<int>& default_items) {
  InitDataSpec(spec, n, default_values, default_items);
  SktReadKeyword("format", spec.format, kDataConstant);
  if (!formats.empty() && std::find(formats.begin(), formats.end(), spec.format) == formats.end())
    FatalError(format_message + " (format = " + std::to_string(spec.format) + " in " + SktSectionPath() + ")");
  switch (spec.format) {
    case kDataConstant:
      ReadComponents("constant_value", "constant_values", spec.constant_values);
      break;
    case kDataFile:
    case kDataFileOnce:
    case kDataFileMap:
      ReadFileName(spec);
      ReadComponents("item_number", "item_numbers", spec.item_numbers);
      break;
    case kDataSoftStartFactor:
      break;
    default:
      StopRun(SubstituteValue("Format not supported for data input: format = % in section ",
                              spec.format) +
              SktSectionPath());
  }
  SktReadKeyword("type_of_soft_start", spec.type_of_soft_start, kSoftStartSine);
  SktReadKeyword("soft_time_interval", spec.soft_time_interval, 0.0);
  ReadComponents("reference_value", "reference_values", spec.reference_values);
  int time_interpolation = kTimeInterpolationLinear;
  SktReadKeyword("type_of_time_interpolation", time_interpolation, kTimeInterpolationLinear);
  if (time_interpolation < 1)
    StopRun(
        SubstituteValue(
            "Type not supported for time interpolation: type_of_time_interpolation = % in section ",
            time_interpolation) +
        SktSectionPath());
  for (int& t : spec.time_interpolation) t = time_interpolation;
  if (spec.format == kDataFileOnce || spec.format == kDataFileMap)
    SktReadKeyword("type_of_space_interpolation", spec.type_of_space_interpolation, 0);
}

double SoftStartFactor(int type, double interval, double t) {
  if (type == kSoftStartNone || !(interval > 0.0) || t > interval) return 1.0;
  // Before the start the factor stays at its start value.
  const double s = std::max(t, 0.0) / interval;
  switch (type) {
    case kSoftStartLinear:
      return s;
    case kSoftStartSine:
      return (std::sin((s - 0.5) * std::numbers::pi) + 1.0) / 2.0;
    default:
      return 1.0;
  }
}

double InterpolateInTime(int type, double a, double b, double w) {
  if (type >= kTimeInterpolationCircular) {
    const double d = b - a;
    if (std::abs(d) > 180.0) b += d >= 180.0 ? -360.0 : 360.0;
  }
  return a * (1.0 - w) + b * w;
}

int CheckDataCoverage(int nsteps, double first, double last, double start, double end,
                      const std::string& file_name, int* status) {
  constexpr double kTolerance = 1e-6;
  int code = 0;
  if (nsteps <= 1) {
    if (std::abs(end - start) > kTolerance) code = 1;
  } else if (first > start || last < end - kTolerance) {
    code = 2;
  }
  if (status) {
    *status = code;
    return code;
  }
  if (code == 1)
    FatalError("The data does not cover the entire simulation - only one time step in file: " +
               ZrnLogName(file_name));
  if (code == 2)
    FatalError("The data does not cover the entire simulation: " + ZrnLogName(file_name));
  return code;
}

double TableLookup(std::span<const double> x, std::span<const double> y, double v) {
  const std::size_t m = std::min(x.size(), y.size());
  if (m == 0) return 0.0;
  if (v <= x[0]) return y[0];
  if (v >= x[m - 1]) return y[m - 1];
  // The last pair whose interval holds v; intervals of zero width hold nothing.
  for (std::size_t i = m - 1; i-- > 0;) {
    if (x[i] <= v && v <= x[i + 1] && x[i + 1] > x[i]) {
      const double w = (v - x[i]) / (x[i + 1] - x[i]);
      return y[i] * (1.0 - w) + y[i + 1] * w;
    }
  }
  return y[m - 1];
}

}  // namespace vhd
