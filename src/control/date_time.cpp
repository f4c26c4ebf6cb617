#include "control/date_time.hpp"

#include <cmath>
#include <cstdint>
#include <cstdio>

namespace vhd {

namespace {

bool IsLeapYear(int y) { return (y % 4 == 0 && y % 100 != 0) || y % 400 == 0; }

int DaysInMonth(int y, int m) {
  static constexpr int kDays[12] = {31, 28, 31, 30, 31, 30, 31, 31, 30, 31, 30, 31};
  return m == 2 && IsLeapYear(y) ? 29 : kDays[m - 1];
}

// Days since 1970-01-01 of a civil date (Howard Hinnant's algorithm).
std::int64_t DaysFromCivil(std::int64_t y, int m, int d) {
  y -= m <= 2;
  const std::int64_t era = (y >= 0 ? y : y - 399) / 400;
  const std::int64_t yoe = y - era * 400;
  const std::int64_t doy = (153 * (m + (m > 2 ? -3 : 9)) + 2) / 5 + d - 1;
  const std::int64_t doe = yoe * 365 + yoe / 4 - yoe / 100 + doy;
  return era * 146097 + doe - 719468;
}

void CivilFromDays(std::int64_t z, int& y, int& m, int& d) {
  z += 719468;
  const std::int64_t era = (z >= 0 ? z : z - 146096) / 146097;
  const std::int64_t doe = z - era * 146097;
  const std::int64_t yoe = (doe - doe / 1460 + doe / 36524 - doe / 146096) / 365;
  const std::int64_t doy = doe - (365 * yoe + yoe / 4 - yoe / 100);
  const std::int64_t mp = (5 * doy + 2) / 153;
  d = static_cast<int>(doy - (153 * mp + 2) / 5 + 1);
  m = static_cast<int>(mp < 10 ? mp + 3 : mp - 9);
  y = static_cast<int>(yoe + era * 400 + (m <= 2));
}

}  // namespace

bool IsValidDateTime(const DateTime& dt) {
  const auto [y, mo, d, h, mi, s] = dt;
  if (y < 1 || y > 9999 || mo < 1 || mo > 12) return false;
  if (d < 1 || d > DaysInMonth(y, mo)) return false;
  return h >= 0 && h <= 23 && mi >= 0 && mi <= 59 && s >= 0 && s <= 59;
}

DateTime AddSeconds(const DateTime& start, double seconds) {
  const std::int64_t start_s = DaysFromCivil(start[0], start[1], start[2]) * 86400 +
                               start[3] * 3600 + start[4] * 60 + start[5];
  // A step time such as 3*0.1 s may lie a hair below the whole second it
  // stands for; the small guard keeps it on that second.
  const std::int64_t total = start_s + static_cast<std::int64_t>(std::floor(seconds + 1e-6));
  std::int64_t days = total / 86400;
  std::int64_t rest = total % 86400;
  if (rest < 0) {
    rest += 86400;
    --days;
  }
  DateTime out{};
  CivilFromDays(days, out[0], out[1], out[2]);
  out[3] = static_cast<int>(rest / 3600);
  out[4] = static_cast<int>(rest / 60 % 60);
  out[5] = static_cast<int>(rest % 60);
  return out;
}

std::string FormatDateTime(const DateTime& dt) {
  char buf[64];
  std::snprintf(buf, sizeof buf, "%04d-%02d-%02d %02d:%02d:%02d", dt[0], dt[1], dt[2], dt[3], dt[4],
                dt[5]);
  return buf;
}

}  // namespace vhd
