// Text of numbers in messages and value lines.

#include <fmt/core.h>

#include <algorithm>
#include <charconv>
#include <cmath>
#include <string>

#include "log/log.hpp"

namespace vhd {

namespace {

std::string_view Trim(std::string_view text) {
  const auto first = text.find_first_not_of(' ');
  if (first == std::string_view::npos) return {};
  const auto last = text.find_last_not_of(' ');
  return text.substr(first, last - first + 1);
}

// Scientific form with one digit before the point and up to ten after it,
// trailing zeros of the mantissa removed and the point kept: 1.5E+10, 1.E-07.
std::string ExponentText(double x) {
  std::string text = fmt::format("{:.10E}", x);
  const auto e = text.find('E');
  auto end = text.find_last_not_of('0', e - 1);
  return text.substr(0, end + 1) + text.substr(e);
}

// Fixed form with six decimals, trailing zeros removed, and the point too
// when nothing follows it: 30, 1.25.
std::string FixedText(double x) {
  std::string text = fmt::format("{:.6f}", x);
  text.erase(text.find_last_not_of('0') + 1);
  if (text.back() == '.') text.pop_back();
  return text;
}

// A fraction 0 < |x| < 1 (above 1e-6) as "0." and its six rounded decimals
// without trailing zeros.
std::string FractionText(double x) {
  const long long micro = std::llround(std::fabs(x) * 1e6);
  const char* sign = x < 0 ? "-" : "";
  if (micro >= 1000000) return fmt::format("{}1", sign);  // 0.9999996 rounds up to 1
  std::string digits = fmt::format("{:06d}", micro);
  digits.erase(digits.find_last_not_of('0') + 1);
  return fmt::format("{}0.{}", sign, digits);
}

std::string ValueText(double x) { return std::string(Trim(NumberText(x, 10))); }

std::string Substitute(std::string_view templ, std::string_view value) {
  const auto pct = templ.find('%');
  if (pct == std::string_view::npos) {
    // A template without a place for the value keeps the value behind it.
    std::string out(templ.substr(0, templ.find_last_not_of(' ') + 1));
    out += ' ';
    out += value;
    return out;
  }
  std::string_view rest = templ.substr(pct + 1);
  rest = rest.substr(0, rest.find_last_not_of(' ') + 1);
  std::string out(templ.substr(0, pct));
  out += value;
  out += rest;
  return out;
}

// The text of x before it is right-adjusted.
std::string PlainNumberText(double x, int w) {
  if (std::isnan(x)) return "NaN";
  if (std::isinf(x)) return x > 0 ? "Infinity" : "-Infinity";
  const double ax = std::fabs(x);
  if (ax <= 1e-100) return "0";
  const double hi = std::pow(10.0, w - 1) - 1.0;
  const double lo = 1.0 / std::pow(10.0, w - 4);
  if (ax >= hi || ax <= lo) return ExponentText(x);
  if (ax < 1.0) return FractionText(x);
  return FixedText(x);
}

}  // namespace

std::string NumberText(double x, int w) {
  w = std::clamp(w, 1, 20);
  std::string text = PlainNumberText(x, w);
  // Right-adjusted in w characters; a longer text is kept whole rather than cut.
  if (static_cast<int>(text.size()) < w) text.insert(0, w - text.size(), ' ');
  return text;
}

std::string SubstituteValue(std::string_view templ, double value) { return Substitute(templ, ValueText(value)); }

std::string SubstituteValue(std::string_view templ, int value) { return Substitute(templ, ValueText(value)); }

std::string SubstituteValue(std::string_view templ, long long value) {
  return Substitute(templ, ValueText(static_cast<double>(value)));
}

std::string SubstituteValue(std::string_view templ, float value) {
  // Through the shortest decimal text of the single value, so that 0.1f
  // prints as 0.1 and 1.1e10f as 1.1E+10.
  char buf[32];
  const auto res = std::to_chars(buf, buf + sizeof buf, value);
  double x = value;
  std::from_chars(buf, res.ptr, x);
  return Substitute(templ, ValueText(x));
}

std::string SubstituteValue(std::string_view templ, std::string_view value) {
  return Substitute(templ, Trim(value));
}

std::string SubstituteValue(std::string_view templ, const char* value) {
  return Substitute(templ, Trim(value ? std::string_view(value) : std::string_view{}));
}

}  // namespace vhd
