// zrntool: inspect and convert zrn data files.
//
//   zrntool info FILE
//       header, time axis, items and statistics (minimum, maximum, mean).
//   zrntool csv2zrn0 CSV ZRN0 [--type K[,K...]] [--unit U[,U...]] [--title T] [--float]
//       a time series from a CSV file: a header line, then one line per time
//       step: "YYYY-MM-DD hh:mm:ss" and one value per item (empty or NaN: no
//       data). Item types and units are unit-library keys or identifiers, one
//       for all items or one per item; the default is undefined. Equally spaced
//       times give an equidistant axis.
//   zrntool zrn2csv ZRN0 CSV
//       the items of a time series back to CSV ("-" writes to standard output).

#include <fmt/format.h>

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <iostream>
#include <sstream>
#include <string>
#include <vector>

#include "io/units.hpp"
#include "io/zrn.hpp"

namespace {

using namespace vhd;

int Usage() {
  std::cerr << "Usage: zrntool info FILE\n"
               "       zrntool csv2zrn0 CSV ZRN0 [--type K[,K...]] [--unit U[,U...]] "
               "[--title T] [--float]\n"
               "       zrntool zrn2csv ZRN0 CSV\n";
  return 2;
}

int Fail(const std::string& text) {
  std::cerr << "zrntool: " << text << "\n";
  return 1;
}

int LayerFail(const ZrnFile& f, int code) {
  std::string text = "ZRN Error: " + zrnErrorText(code) + " - file: " + f.name;
  if (!f.detail.empty()) text += " (" + f.detail + ")";
  return Fail(text);
}

std::string Trim(const std::string& s) {
  const auto a = s.find_first_not_of(" \t\r\n");
  if (a == std::string::npos) return "";
  const auto b = s.find_last_not_of(" \t\r\n");
  return s.substr(a, b - a + 1);
}

std::vector<std::string> Split(const std::string& line, char sep) {
  std::vector<std::string> out;
  std::string cell;
  std::istringstream in(line);
  while (std::getline(in, cell, sep)) out.push_back(Trim(cell));
  if (!line.empty() && line.back() == sep) out.emplace_back();
  return out;
}

// ---- info ----------------------------------------------------------------------------

std::string AxisName(int type) {
  switch (type) {
    case kZrnAxisD0: return "point";
    case kZrnAxisD1: return "line";
    case kZrnAxisD2: return "2D grid";
    case kZrnAxisD3: return "3D grid";
    case kZrnAxisD4: return "mesh";
    default: return "undefined";
  }
}

std::string AxisSize(const ZrnSpatialAxis& a) {
  switch (a.type) {
    case kZrnAxisD1: return fmt::format("{} (x0 {}, dx {})", a.n[0], a.x0[0], a.dx[0]);
    case kZrnAxisD2: return fmt::format("{} x {}", a.n[0], a.n[1]);
    case kZrnAxisD3: return fmt::format("{} x {} x {}", a.n[0], a.n[1], a.n[2]);
    case kZrnAxisD4:
      return fmt::format("{} {}", a.n[0],
                         a.location == kZrnLocationNode ? "nodes"
                         : a.location == kZrnLocationFace ? "elements"
                                                         : "volumes");
    default: return "1";
  }
}

struct Stats {
  double min = 0, max = 0, sum = 0;
  long long n = 0;
  void Add(const std::vector<double>& v, double delete_value) {
    for (double x : v) {
      if (std::isnan(x) || static_cast<float>(x) == static_cast<float>(delete_value)) continue;
      if (n == 0) min = max = x;
      min = std::min(min, x);
      max = std::max(max, x);
      sum += x;
      ++n;
    }
  }
  std::string Text() const {
    if (n == 0) return fmt::format("{:>14} {:>14} {:>14}", "-", "-", "-");
    return fmt::format("{:>14.6g} {:>14.6g} {:>14.6g}", min, max, sum / static_cast<double>(n));
  }
};

void PrintItem(int k, const ZrnItemInfo& it, const Stats& s) {
  std::cout << fmt::format("  {:>3}  {:<28} {:<22} {:<10} {:<8} {:<22} {}\n", k, it.name,
                           uvqGetItemTypeName(it.item_type) + " (" + std::to_string(it.item_type) + ")",
                           uvqGetUnitName(it.unit), AxisName(it.axis.type), AxisSize(it.axis),
                           s.Text());
}

int Info(const std::string& name) {
  ZrnFile f;
  int status = 0;
  if (zrnFileRead(f, name, &status) != kZrnOk) return LayerFail(f, status);
  std::cout << "File            : " << name << "\n"
            << "Title           : " << f.title << "\n"
            << "Source          : " << f.creator << "\n"
            << "File type       : " << f.file_type << "\n"
            << "Data type       : " << f.data_type << "\n"
            << "Delete value    : " << fmt::format("{}", f.delete_value) << "\n"
            << "Projection      : " << f.projection << "\n";
  if (f.epsg > 0) std::cout << "EPSG            : " << f.epsg << "\n";
  for (const auto& b : f.blocks) {
    std::cout << "Block " << b.name << " :";
    for (double v : b.values) std::cout << " " << fmt::format("{}", v);
    std::cout << "\n";
  }
  const bool calendar = f.time.type == kZrnTimeEqCalendar || f.time.type == kZrnTimeNeqCalendar;
  const bool eq = f.time.type == kZrnTimeEqCalendar || f.time.type == kZrnTimeEqRelative;
  std::cout << "Time axis       : "
            << (f.time.type == kZrnTimeUndefined ? "none"
                                                 : std::string(eq ? "equidistant" : "non-equidistant") +
                                                       (calendar ? " calendar" : " relative"))
            << "\n";
  if (calendar) std::cout << "Start           : " << zrnDateTimeText(f.time.start) << "\n";
  if (eq) std::cout << "Time step       : " << fmt::format("{}", f.time.dt) << " s\n";
  std::cout << "Time steps      : " << f.time.nsteps << "\n";
  if (f.time.nsteps > 0) {
    double last = 0;
    zrnGetStepTime(f, f.time.nsteps - 1, last);
    if (calendar) std::cout << "End             : " << zrnDateTimeText(zrnAddSeconds(f.time.start, last)) << "\n";
  }
  const std::string head = fmt::format("  {:>3}  {:<28} {:<22} {:<10} {:<8} {:<22} {:>14} {:>14} {:>14}\n",
                                       "No", "Name", "Type", "Unit", "Axis", "Size", "Minimum",
                                       "Maximum", "Mean");
  std::cout << "Static items    : " << f.statics.size() << "\n";
  if (!f.statics.empty()) std::cout << head;
  for (std::size_t k = 0; k < f.statics.size(); ++k) {
    ZrnItemInfo info;
    std::vector<double> v(static_cast<size_t>(f.statics[k].axis.Count()));
    Stats s;
    if (zrnStaticRead(f, info, &status) != kZrnOk ||
        zrnStaticGetData(f, v.data(), static_cast<long>(v.size()), &status) != kZrnOk)
      return LayerFail(f, status);
    s.Add(v, f.delete_value);
    PrintItem(static_cast<int>(k) + 1, info, s);
  }
  std::cout << "Dynamic items   : " << f.items.size() << "\n";
  if (!f.items.empty()) std::cout << head;
  std::vector<Stats> stats(f.items.size());
  std::vector<std::vector<double>> buf(f.items.size());
  for (std::size_t k = 0; k < f.items.size(); ++k)
    buf[k].resize(static_cast<size_t>(f.items[k].axis.Count()));
  for (int s = 0; s < f.time.nsteps; ++s)
    for (std::size_t k = 0; k < f.items.size(); ++k) {
      int item = 0;
      double t = 0;
      if (zrnReadItemTimeStep(f, item, t, buf[k].data(), static_cast<long>(buf[k].size()), &status) !=
          kZrnOk)
        return LayerFail(f, status);
      stats[k].Add(buf[k], f.delete_value);
    }
  for (std::size_t k = 0; k < f.items.size(); ++k)
    PrintItem(static_cast<int>(k) + 1, f.items[k], stats[k]);
  zrnHeaderDestroy(f);
  return 0;
}

// ---- csv2zrn0 -------------------------------------------------------------------------

// Keys from "100000,1000" or identifiers ("uvqIWaterLevel"); one for all or one per item.
bool ParseKeys(const std::string& text, bool units, std::size_t nitems, std::vector<int>& keys,
               std::string& error) {
  keys.clear();
  for (const auto& w : Split(text, ',')) {
    char* end = nullptr;
    const long v = std::strtol(w.c_str(), &end, 10);
    int key = 0;
    if (!w.empty() && *end == '\0') {
      key = static_cast<int>(v);
      if (units ? !uvqIsUnit(key) : !uvqIsItemType(key)) {
        error = std::string(units ? "unit " : "item type ") + w + " is not known";
        return false;
      }
    } else {
      key = units ? uvqGetUnitKey(w) : uvqGetItemTypeKey(w);
      if (key == (units ? kUvqUnitUndefined : kUvqItemUndefined)) {
        error = std::string(units ? "unit '" : "item type '") + w + "' is not known";
        return false;
      }
    }
    keys.push_back(key);
  }
  if (keys.size() == 1) keys.assign(nitems, keys[0]);
  if (keys.size() != nitems) {
    error = std::string(units ? "--unit" : "--type") + " gives " + std::to_string(keys.size()) +
            " values for " + std::to_string(nitems) + " items";
    return false;
  }
  return true;
}

int CsvToZrn0(const std::vector<std::string>& args) {
  if (args.size() < 2) return Usage();
  const std::string csv = args[0], out = args[1];
  std::string types_text, units_text, title = "Time series from " + csv;
  int precision = kZrnDouble;
  for (std::size_t i = 2; i < args.size(); ++i) {
    const bool has_value = i + 1 < args.size();
    if (args[i] == "--type" && has_value) types_text = args[++i];
    else if (args[i] == "--unit" && has_value) units_text = args[++i];
    else if (args[i] == "--title" && has_value) title = args[++i];
    else if (args[i] == "--float") precision = kZrnFloat;
    else return Fail("unknown option '" + args[i] + "'");
  }
  std::ifstream in(csv);
  if (!in) return Fail("cannot open " + csv);
  std::string line;
  int line_no = 0;
  std::vector<std::string> names;
  char sep = ',';
  while (names.empty() && std::getline(in, line)) {
    ++line_no;
    if (Trim(line).empty()) continue;
    if (line.find(',') == std::string::npos && line.find(';') != std::string::npos) sep = ';';
    names = Split(line, sep);
  }
  if (names.size() < 2) return Fail(csv + ": the header line needs a time column and at least one item");
  names.erase(names.begin());
  for (std::size_t k = 0; k < names.size(); ++k)
    if (names[k].empty()) names[k] = "Item " + std::to_string(k + 1);
  std::vector<int> types(names.size(), kUvqItemUndefined), units(names.size(), kUvqUnitUndefined);
  std::string error;
  if (!types_text.empty() && !ParseKeys(types_text, false, names.size(), types, error)) return Fail(error);
  if (!units_text.empty() && !ParseKeys(units_text, true, names.size(), units, error)) return Fail(error);
  for (std::size_t k = 0; k < names.size(); ++k)
    if (types[k] != kUvqItemUndefined && units[k] == kUvqUnitUndefined)
      units[k] = uvqGetItemUserUnit(types[k]);
    else if (!uvqItemUnitEqv(types[k], units[k]))
      return Fail(uvqCheckUnitType(types[k], types[k], units[k]) + " (item '" + names[k] + "')");

  // Read the rows: date-time and values.
  std::vector<ZrnDateTime> dates;
  std::vector<std::vector<double>> rows;
  while (std::getline(in, line)) {
    ++line_no;
    if (Trim(line).empty()) continue;
    const auto cells = Split(line, sep);
    const std::string where = csv + " line " + std::to_string(line_no);
    ZrnDateTime t;
    if (cells.empty() || !zrnParseDateTime(cells[0], t))
      return Fail(where + ": '" + (cells.empty() ? "" : cells[0]) +
                  "' is not a date-time YYYY-MM-DD hh:mm:ss");
    if (cells.size() > names.size() + 1)
      return Fail(where + ": " + std::to_string(cells.size() - 1) + " values for " +
                  std::to_string(names.size()) + " items");
    std::vector<double> row(names.size(), kZrnDefaultDeleteValue);
    for (std::size_t k = 0; k + 1 < cells.size(); ++k) {
      const std::string& c = cells[k + 1];
      if (c.empty() || c == "NaN" || c == "nan") continue;
      char* end = nullptr;
      const double v = std::strtod(c.c_str(), &end);
      if (*end != '\0' || !std::isfinite(v))
        return Fail(where + ": '" + c + "' in column '" + names[k] + "' is not a number");
      row[k] = v;
    }
    if (!dates.empty() && zrnSecondsBetween(dates.back(), t) <= 0)
      return Fail(where + ": " + zrnDateTimeText(t) + " does not follow " + zrnDateTimeText(dates.back()));
    dates.push_back(t);
    rows.push_back(std::move(row));
  }
  if (dates.empty()) return Fail(csv + ": no time steps");

  bool equidistant = dates.size() >= 2;
  const double dt = equidistant ? zrnSecondsBetween(dates[0], dates[1]) : 0.0;
  for (std::size_t s = 2; s < dates.size() && equidistant; ++s)
    equidistant = zrnSecondsBetween(dates[s - 1], dates[s]) == dt;

  ZrnFile f;
  int status = 0;
  if (zrnHeaderCreate(f, out, kZrnFileData, title, &status) != kZrnOk) return LayerFail(f, status);
  if (equidistant) zrnSetEqCalendarAxis(f, dates[0], dt, &status);
  else zrnSetNeqCalendarAxis(f, dates[0], &status);
  if (status != kZrnOk) return LayerFail(f, status);
  for (std::size_t k = 0; k < names.size(); ++k) {
    const int item = static_cast<int>(k) + 1;
    if (zrnSetItemInfo(f, item, names[k], types[k], units[k], precision, &status) != kZrnOk ||
        zrnSetItemAxisEqD0(f, item, &status) != kZrnOk)
      return LayerFail(f, status);
  }
  if (zrnFileCreate(f, false, &status) != kZrnOk) return LayerFail(f, status);
  for (std::size_t s = 0; s < rows.size(); ++s) {
    const double t = zrnSecondsBetween(dates[0], dates[s]);
    for (std::size_t k = 0; k < names.size(); ++k)
      if (zrnWriteItemTimeStep(f, t, &rows[s][k], 1, &status) != kZrnOk) return LayerFail(f, status);
  }
  if (zrnFileClose(f, &status) != kZrnOk) return LayerFail(f, status);
  std::cout << "zrntool: " << out << ": " << names.size() << " items, " << rows.size()
            << " time steps\n";
  return 0;
}

// ---- zrn2csv --------------------------------------------------------------------------

int Zrn0ToCsv(const std::string& in_name, const std::string& out_name) {
  ZrnFile f;
  int status = 0;
  if (zrnFileRead(f, in_name, &status) != kZrnOk) return LayerFail(f, status);
  for (const auto& it : f.items)
    if (it.axis.type != kZrnAxisD0)
      return Fail(in_name + ": item '" + it.name + "' is not a point series");
  const bool calendar = f.time.type == kZrnTimeEqCalendar || f.time.type == kZrnTimeNeqCalendar;
  std::ofstream file;
  if (out_name != "-") {
    file.open(out_name);
    if (!file) return Fail("cannot create " + out_name);
  }
  std::ostream& out = out_name == "-" ? std::cout : file;
  out << (calendar ? "time" : "time (s)");
  for (const auto& it : f.items) out << "," << it.name;
  out << "\n";
  for (int s = 0; s < f.time.nsteps; ++s) {
    double t = 0;
    zrnGetStepTime(f, s, t);
    out << (calendar ? zrnDateTimeText(zrnAddSeconds(f.time.start, t)) : fmt::format("{}", t));
    for (std::size_t k = 0; k < f.items.size(); ++k) {
      int item = 0;
      double v = 0, tt = 0;
      if (zrnReadItemTimeStep(f, item, tt, &v, 1, &status) != kZrnOk) return LayerFail(f, status);
      const bool missing = f.items[k].precision == kZrnFloat
                               ? static_cast<float>(v) == static_cast<float>(f.delete_value)
                               : v == f.delete_value;
      out << ",";
      if (!missing) {
        // Single-precision items print with the digits they hold.
        if (f.items[k].precision == kZrnFloat) out << fmt::format("{}", static_cast<float>(v));
        else out << fmt::format("{}", v);
      }
    }
    out << "\n";
  }
  zrnHeaderDestroy(f);
  if (!out) return Fail("cannot write " + out_name);
  return 0;
}

}  // namespace

int main(int argc, char** argv) {
  std::vector<std::string> args(argv + 1, argv + argc);
  if (args.empty()) return Usage();
  const std::string cmd = args[0];
  args.erase(args.begin());
  if (cmd == "info" && args.size() == 1) return Info(args[0]);
  if (cmd == "csv2zrn0") return CsvToZrn0(args);
  if (cmd == "zrn2csv" && args.size() == 2) return Zrn0ToCsv(args[0], args[1]);
  return Usage();
}
