// Data-file layer: error texts, date-times, header values, time axes, items.

#include <cmath>
#include <cstdio>
#include <cstdlib>

#include <netcdf.h>

#include "io/zrn.hpp"
#include "io/zrn_internal.hpp"
#include "log/log.hpp"

namespace vhd {

namespace zrn_detail {

int Finish(const std::string& file_name, const std::string& detail, int code, int* status) {
  if (status != nullptr) {
    *status = code;
    return code;
  }
  if (code == kZrnOk) return code;
  std::string text = "ZRN Error: " + zrnErrorText(code) + " - file: " + ZrnLogName(file_name);
  if (!detail.empty()) text += " (" + detail + ")";
  StopRun(text);
}

int Fail(ZrnFile& f, int code, const std::string& detail) {
  f.detail = detail;
  return code;
}

const char* TimeAxisText(int type) {
  switch (type) {
    case kZrnTimeEqRelative: return "equidistant relative";
    case kZrnTimeNeqRelative: return "non-equidistant relative";
    case kZrnTimeEqCalendar: return "equidistant calendar";
    case kZrnTimeNeqCalendar: return "non-equidistant calendar";
    default: return "undefined";
  }
}

int TimeAxisFromText(const std::string& text) {
  for (int t = kZrnTimeEqRelative; t <= kZrnTimeNeqCalendar; ++t)
    if (text == TimeAxisText(t)) return t;
  return kZrnTimeUndefined;
}

std::string AxisProblem(const ZrnSpatialAxis& a) {
  static const char* const kNames[3] = {"x", "y", "z"};
  if (a.type == kZrnAxisD4) {
    if (a.n[0] < 1) return "mesh item without values";
    if (a.location != kZrnLocationFace && a.location != kZrnLocationNode &&
        a.location != kZrnLocationVolume)
      return "mesh location " + std::to_string(a.location);
    return "";
  }
  if (a.type < kZrnAxisD0 || a.type > kZrnAxisD3) return "undefined spatial axis";
  for (int k = 0; k < a.type; ++k) {
    const std::string which = kNames[k];
    if (a.n[k] < 1) return "size of " + which + " is " + std::to_string(a.n[k]);
    if (!std::isfinite(a.x0[k])) return "origin of " + which + " is not finite";
    if (!std::isfinite(a.dx[k]) || a.dx[k] == 0.0)
      return "spacing of " + which + " must be finite and non-zero";
  }
  return "";
}

}  // namespace zrn_detail

using zrn_detail::Fail;
using zrn_detail::Finish;

std::string zrnErrorText(int code) {
  switch (code) {
    case 101: return "Unable to open ZRN file";
    case 102: return "Invalid type of ZRN file";
    case 103: return "Invalid item number";
    case 104: return "Unable to detect number of static items";
    case 105: return "Invalid item";
    case 106: return "Invalid spatial axis";
    case 107: return "Invalid time axis";
    case 108: return "Unable to add custom block";
    case 109: return "Unable to get custom block value";
    case 110: return "Unable to set custom block value";
    case 111: return "Unable to allocate memory";
    case 201: return "Unable to read static item";
    case 202: return "Unable to read dynamic item";
    case 203: return "Static read call after dynamic";
    case 204: return "Unable to skip data";
    case 205: return "Unable to flush file";
    case 301: return "Unable to create header";
    case 302: return "Unable to create file";
    case 401: return "Unable to write static item";
    case 402: return "Unable to write dynamic item";
    case 403: return "Static write call after dynamic";
    case 501: return "Unable to locate static block";
    case 502: return "Unable to locate dynamic block";
    default: return "Unknown error: " + std::to_string(code);
  }
}

int zrnFileKind(std::string_view file_name) {
  const auto dot = file_name.rfind('.');
  if (dot == std::string_view::npos) return -1;
  std::string ext(file_name.substr(dot + 1));
  for (auto& c : ext) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
  if (ext == "zrn0") return 0;
  if (ext == "zrn1") return 1;
  if (ext == "zrn2") return 2;
  if (ext == "zrn3") return 3;
  if (ext == "zrnu") return 4;
  return -1;
}

std::string ZrnLogName(const std::string& file_name) {
  if (std::getenv("VX7F90_LOG_NOPATH") == nullptr) return file_name;
  const auto slash = file_name.find_last_of("/\\");
  return slash == std::string::npos ? file_name : file_name.substr(slash + 1);
}

// ---- date-times --------------------------------------------------------------------

namespace {

// Days from 1970-01-01 to a proleptic Gregorian date (H. Hinnant's algorithm).
long long DaysFromCivil(int y, int m, int d) {
  y -= m <= 2;
  const long long era = (y >= 0 ? y : y - 399) / 400;
  const unsigned yoe = static_cast<unsigned>(y - era * 400);
  const unsigned doy = (153 * (m + (m > 2 ? -3 : 9)) + 2) / 5 + static_cast<unsigned>(d) - 1;
  const unsigned doe = yoe * 365 + yoe / 4 - yoe / 100 + doy;
  return era * 146097 + static_cast<long long>(doe) - 719468;
}

void CivilFromDays(long long z, int& y, int& m, int& d) {
  z += 719468;
  const long long era = (z >= 0 ? z : z - 146096) / 146097;
  const unsigned doe = static_cast<unsigned>(z - era * 146097);
  const unsigned yoe = (doe - doe / 1460 + doe / 36524 - doe / 146096) / 365;
  const unsigned doy = doe - (365 * yoe + yoe / 4 - yoe / 100);
  const unsigned mp = (5 * doy + 2) / 153;
  d = static_cast<int>(doy - (153 * mp + 2) / 5 + 1);
  m = static_cast<int>(mp < 10 ? mp + 3 : mp - 9);
  y = static_cast<int>(static_cast<long long>(yoe) + era * 400 + (m <= 2));
}

long long SecondsOf(const ZrnDateTime& t) {
  return DaysFromCivil(t.year, t.month, t.day) * 86400LL + t.hour * 3600LL + t.minute * 60LL +
         t.second;
}

bool ValidDateTime(const ZrnDateTime& t) {
  static const int kDays[12] = {31, 29, 31, 30, 31, 30, 31, 31, 30, 31, 30, 31};
  if (t.month < 1 || t.month > 12 || t.day < 1 || t.day > kDays[t.month - 1]) return false;
  if (t.month == 2 && t.day == 29) {
    const bool leap = (t.year % 4 == 0 && t.year % 100 != 0) || t.year % 400 == 0;
    if (!leap) return false;
  }
  return t.hour >= 0 && t.hour < 24 && t.minute >= 0 && t.minute < 60 && t.second >= 0 &&
         t.second < 61;
}

}  // namespace

ZrnDateTime zrnDateTime(const std::array<int, 6>& a) {
  return ZrnDateTime{a[0], a[1], a[2], a[3], a[4], a[5]};
}

double zrnSecondsBetween(const ZrnDateTime& a, const ZrnDateTime& b) {
  return static_cast<double>(SecondsOf(b) - SecondsOf(a));
}

ZrnDateTime zrnAddSeconds(const ZrnDateTime& t, double s) {
  const long long total = SecondsOf(t) + std::llround(s);
  long long days = total / 86400;
  long long rest = total % 86400;
  if (rest < 0) {
    rest += 86400;
    --days;
  }
  ZrnDateTime r;
  CivilFromDays(days, r.year, r.month, r.day);
  r.hour = static_cast<int>(rest / 3600);
  r.minute = static_cast<int>(rest % 3600 / 60);
  r.second = static_cast<int>(rest % 60);
  return r;
}

std::string zrnDateTimeText(const ZrnDateTime& t) {
  char buf[64];
  std::snprintf(buf, sizeof buf, "%04d-%02d-%02d %02d:%02d:%02d", t.year, t.month, t.day, t.hour,
                t.minute, t.second);
  return buf;
}

bool zrnParseDateTime(std::string_view text, ZrnDateTime& t) {
  std::string s(text);
  for (auto& c : s)
    if (c == 'T' || c == 't') c = ' ';
  ZrnDateTime r{0, 1, 1, 0, 0, 0};
  double sec = 0;
  int used = 0;
  const int n = std::sscanf(s.c_str(), " %d-%d-%d%n", &r.year, &r.month, &r.day, &used);
  if (n < 3) return false;
  const char* rest = s.c_str() + used;
  int h = 0, mi = 0;
  const int k = std::sscanf(rest, " %d:%d:%lf", &h, &mi, &sec);
  if (k >= 1) r.hour = h;
  if (k >= 2) r.minute = mi;
  if (k >= 3) {
    if (sec < 0 || sec >= 61) return false;
    r.second = static_cast<int>(std::floor(sec + 1e-9));
  }
  if (k < 1) {
    // Nothing or a time zone after the date only.
    for (const char* p = rest; *p != '\0'; ++p)
      if (!std::isspace(static_cast<unsigned char>(*p)) && *p != 'Z' && *p != 'z') return false;
  }
  if (!ValidDateTime(r)) return false;
  t = r;
  return true;
}

// ---- header ------------------------------------------------------------------------

int zrnHeaderCreate(ZrnFile& f, const std::string& file_name, int file_type,
                    const std::string& title, int* status) {
  zrnHeaderDestroy(f, nullptr);
  f.name = file_name;
  f.file_type = file_type;
  f.title = title;
  if (file_name.empty() || (file_type != kZrnFileData && !zrnIsMeshFileType(file_type)))
    return Finish(f, Fail(f, kZrnErrCreateHeader, "file type " + std::to_string(file_type)),
                  status);
  f.writing = true;
  return Finish(f, kZrnOk, status);
}

int zrnHeaderDestroy(ZrnFile& f, int* status) {
  if (f.ncid >= 0) nc_close(f.ncid);
  f = ZrnFile{};
  return Finish(f, kZrnOk, status);
}

namespace {
// Header values may change only between zrnHeaderCreate and zrnFileCreate.
bool HeaderOpen(const ZrnFile& f) { return f.writing && !f.header_ready; }
}  // namespace

int zrnSetDataType(ZrnFile& f, int data_type, int* status) {
  if (!HeaderOpen(f)) return Finish(f, Fail(f, kZrnErrCreateHeader, "header is closed"), status);
  f.data_type = data_type;
  return Finish(f, kZrnOk, status);
}

int zrnGetDataType(const ZrnFile& f, int& data_type, int* status) {
  data_type = f.data_type;
  return Finish(f, kZrnOk, status);
}

int zrnSetDeleteValFloat(ZrnFile& f, double delete_value, int* status) {
  if (!HeaderOpen(f)) return Finish(f, Fail(f, kZrnErrCreateHeader, "header is closed"), status);
  if (!std::isfinite(delete_value))
    return Finish(f, Fail(f, kZrnErrCreateHeader, "delete value is not finite"), status);
  f.delete_value = delete_value;
  return Finish(f, kZrnOk, status);
}

int zrnGetDeleteValFloat(const ZrnFile& f, double& delete_value, int* status) {
  delete_value = f.delete_value;
  return Finish(f, kZrnOk, status);
}

int zrnSetGeoInfoUTMProj(ZrnFile& f, const std::string& projection, double x0, double y0,
                         double orientation, const std::string& crs_wkt, int epsg, int* status) {
  if (!HeaderOpen(f)) return Finish(f, Fail(f, kZrnErrCreateHeader, "header is closed"), status);
  f.projection = projection;
  f.origin_x = x0;
  f.origin_y = y0;
  f.orientation = orientation;
  f.crs_wkt = crs_wkt;
  f.epsg = epsg;
  return Finish(f, kZrnOk, status);
}

int zrnGetGeoInfoUTMProj(const ZrnFile& f, std::string& projection, double& x0, double& y0,
                         double& orientation, int* status) {
  projection = f.projection;
  x0 = f.origin_x;
  y0 = f.origin_y;
  orientation = f.orientation;
  return Finish(f, kZrnOk, status);
}

std::string zrnCustomBlockName(int file_type) {
  return zrnIsMeshFileType(file_type) ? "TANO_KX" : "VX7_Misc";
}

namespace {

bool ValidBlockName(const std::string& name) {
  if (name.empty() || name.size() > 200) return false;
  for (char c : name)
    if (!std::isalnum(static_cast<unsigned char>(c)) && c != '_') return false;
  return true;
}

int AddBlock(ZrnFile& f, const std::string& name, std::vector<double> values, bool integer) {
  if (!HeaderOpen(f)) return Fail(f, kZrnErrAddBlock, "header is closed");
  if (!ValidBlockName(name)) return Fail(f, kZrnErrAddBlock, "block name '" + name + "'");
  if (values.empty()) return Fail(f, kZrnErrAddBlock, "block " + name + " has no values");
  for (auto& b : f.blocks)
    if (b.name == name) {
      b.values = std::move(values);
      b.integer = integer;
      return kZrnOk;
    }
  f.blocks.push_back(ZrnCustomBlock{name, integer, std::move(values)});
  return kZrnOk;
}

}  // namespace

int zrnAddCustomBlock(ZrnFile& f, const std::string& name, const std::vector<int>& values,
                      int* status) {
  return Finish(f, AddBlock(f, name, std::vector<double>(values.begin(), values.end()), true),
                status);
}

int zrnAddCustomBlock(ZrnFile& f, const std::string& name, const std::vector<double>& values,
                      int* status) {
  return Finish(f, AddBlock(f, name, values, false), status);
}

int zrnGetCustomBlockValue(const ZrnFile& f, const std::string& name, int k, double& value,
                           int* status) {
  for (const auto& b : f.blocks)
    if (b.name == name) {
      if (k < 1 || k > static_cast<int>(b.values.size()))
        return Finish(f.name, "block " + name + " has no value " + std::to_string(k),
                      kZrnErrGetBlock, status);
      value = b.values[static_cast<std::size_t>(k - 1)];
      return Finish(f, kZrnOk, status);
    }
  return Finish(f.name, "no block " + name, kZrnErrGetBlock, status);
}

// ---- time axis ---------------------------------------------------------------------

namespace {

int SetAxis(ZrnFile& f, int type, const ZrnDateTime& start, double offset, double dt) {
  if (!HeaderOpen(f)) return Fail(f, kZrnErrTimeAxis, "header is closed");
  const bool eq = type == kZrnTimeEqCalendar || type == kZrnTimeEqRelative;
  if (eq && !(dt > 0.0 && std::isfinite(dt)))
    return Fail(f, kZrnErrTimeAxis, "time step must be positive");
  if (!std::isfinite(offset)) return Fail(f, kZrnErrTimeAxis, "start offset is not finite");
  if ((type == kZrnTimeEqCalendar || type == kZrnTimeNeqCalendar) && !ValidDateTime(start))
    return Fail(f, kZrnErrTimeAxis, "invalid start " + zrnDateTimeText(start));
  f.time = ZrnTimeAxis{};
  f.time.type = type;
  f.time.start = start;
  f.time.start_offset = offset;
  f.time.dt = eq ? dt : 0.0;
  return kZrnOk;
}

}  // namespace

int zrnSetEqCalendarAxis(ZrnFile& f, const ZrnDateTime& start, double dt, int* status) {
  return Finish(f, SetAxis(f, kZrnTimeEqCalendar, start, 0.0, dt), status);
}
int zrnSetNeqCalendarAxis(ZrnFile& f, const ZrnDateTime& start, int* status) {
  return Finish(f, SetAxis(f, kZrnTimeNeqCalendar, start, 0.0, 0.0), status);
}
int zrnSetEqTimeAxis(ZrnFile& f, double start_offset, double dt, int* status) {
  return Finish(f, SetAxis(f, kZrnTimeEqRelative, ZrnDateTime{}, start_offset, dt), status);
}
int zrnSetNeqTimeAxis(ZrnFile& f, double start_offset, int* status) {
  return Finish(f, SetAxis(f, kZrnTimeNeqRelative, ZrnDateTime{}, start_offset, 0.0), status);
}

int zrnGetTimeAxisType(const ZrnFile& f, int& type, int* status) {
  type = f.time.type;
  return Finish(f, kZrnOk, status);
}

namespace {

double Span(const ZrnFile& f) {
  if (f.time.nsteps < 2) return 0.0;
  double first = 0, last = 0;
  zrnGetStepTime(f, 0, first, nullptr);
  zrnGetStepTime(f, f.time.nsteps - 1, last, nullptr);
  return last - first;
}

int AxisIs(const ZrnFile& f, int type) {
  return f.time.type == type ? kZrnOk : kZrnErrTimeAxis;
}

}  // namespace

int zrnGetEqCalendarAxis(const ZrnFile& f, ZrnDateTime& start, double& dt, int& nsteps,
                         int* status) {
  start = f.time.start;
  dt = f.time.dt;
  nsteps = f.time.nsteps;
  return Finish(f.name, "", AxisIs(f, kZrnTimeEqCalendar), status);
}

int zrnGetNeqCalendarAxis(const ZrnFile& f, ZrnDateTime& start, double& span, int& nsteps,
                          int* status) {
  start = f.time.start;
  span = Span(f);
  nsteps = f.time.nsteps;
  return Finish(f.name, "", AxisIs(f, kZrnTimeNeqCalendar), status);
}

int zrnGetEqTimeAxis(const ZrnFile& f, double& start_offset, double& dt, int& nsteps,
                     int* status) {
  start_offset = f.time.start_offset;
  dt = f.time.dt;
  nsteps = f.time.nsteps;
  return Finish(f.name, "", AxisIs(f, kZrnTimeEqRelative), status);
}

int zrnGetNeqTimeAxis(const ZrnFile& f, double& start_offset, double& span, int& nsteps,
                      int* status) {
  start_offset = f.time.start_offset;
  span = Span(f);
  nsteps = f.time.nsteps;
  return Finish(f.name, "", AxisIs(f, kZrnTimeNeqRelative), status);
}

int zrnGetStepTime(const ZrnFile& f, int step, double& seconds, int* status) {
  if (step < 0 || step >= f.time.nsteps)
    return Finish(f.name, "no time step " + std::to_string(step), kZrnErrTimeAxis, status);
  const bool eq = f.time.type == kZrnTimeEqCalendar || f.time.type == kZrnTimeEqRelative;
  if (step < static_cast<int>(f.step_times.size()))
    seconds = f.step_times[static_cast<std::size_t>(step)];
  else if (eq)
    seconds = (f.time.type == kZrnTimeEqRelative ? f.time.start_offset : 0.0) + step * f.time.dt;
  else if (step == 0)
    seconds = f.first_time;
  else if (step == f.time.nsteps - 1)
    seconds = f.last_time;
  else
    return Finish(f.name, "time of step " + std::to_string(step) + " of a file being written",
                  kZrnErrTimeAxis, status);
  return Finish(f, kZrnOk, status);
}

// ---- items -------------------------------------------------------------------------

long ZrnSpatialAxis::Count() const {
  switch (type) {
    case kZrnAxisD0: return 1;
    case kZrnAxisD1: return n[0];
    case kZrnAxisD2: return static_cast<long>(n[0]) * n[1];
    case kZrnAxisD3: return static_cast<long>(n[0]) * n[1] * n[2];
    case kZrnAxisD4: return n[0];
    default: return 0;
  }
}

namespace {

// Item k of a header being written; grows the list to k when k is the next number.
ZrnItemInfo* WritableItem(ZrnFile& f, int item, int& code) {
  if (!HeaderOpen(f)) {
    code = Fail(f, kZrnErrItem, "header is closed");
    return nullptr;
  }
  if (item < 1 || item > static_cast<int>(f.items.size()) + 1) {
    code = Fail(f, kZrnErrItemNumber, "item " + std::to_string(item));
    return nullptr;
  }
  if (item == static_cast<int>(f.items.size()) + 1) f.items.emplace_back();
  code = kZrnOk;
  return &f.items[static_cast<std::size_t>(item - 1)];
}

const ZrnItemInfo* ReadableItem(const ZrnFile& f, int item) {
  if (item < 1 || item > static_cast<int>(f.items.size())) return nullptr;
  return &f.items[static_cast<std::size_t>(item - 1)];
}

int SetAxisOf(ZrnFile& f, int item, const ZrnSpatialAxis& axis) {
  int code = kZrnOk;
  ZrnItemInfo* it = WritableItem(f, item, code);
  if (it == nullptr) return code;
  const std::string problem = zrn_detail::AxisProblem(axis);
  if (!problem.empty()) return Fail(f, kZrnErrSpatialAxis, "item " + std::to_string(item) + ": " + problem);
  it->axis = axis;
  return kZrnOk;
}

}  // namespace

int zrnSetItemInfo(ZrnFile& f, int item, const std::string& name, int item_type, int unit,
                   int precision, int* status) {
  int code = kZrnOk;
  ZrnItemInfo* it = WritableItem(f, item, code);
  if (it == nullptr) return Finish(f, code, status);
  if (name.empty() || (precision != kZrnFloat && precision != kZrnDouble))
    return Finish(f, Fail(f, kZrnErrItem, "item " + std::to_string(item) + " name or precision"),
                  status);
  it->name = name;
  it->item_type = item_type;
  it->unit = unit;
  it->precision = precision;
  return Finish(f, kZrnOk, status);
}

int zrnSetItemValueType(ZrnFile& f, int item, int value_type, int* status) {
  int code = kZrnOk;
  ZrnItemInfo* it = WritableItem(f, item, code);
  if (it == nullptr) return Finish(f, code, status);
  if (value_type < kZrnInstantaneous || value_type > kZrnMeanStepForward)
    return Finish(f, Fail(f, kZrnErrItem, "value type " + std::to_string(value_type)), status);
  it->value_type = value_type;
  return Finish(f, kZrnOk, status);
}

int zrnSetItemAxisEqD0(ZrnFile& f, int item, int* status) {
  ZrnSpatialAxis a;
  a.type = kZrnAxisD0;
  return Finish(f, SetAxisOf(f, item, a), status);
}

int zrnSetItemAxisEqD1(ZrnFile& f, int item, int nx, double x0, double dx, int* status) {
  ZrnSpatialAxis a;
  a.type = kZrnAxisD1;
  a.n = {nx, 1, 1};
  a.x0 = {x0, 0, 0};
  a.dx = {dx, 1, 1};
  return Finish(f, SetAxisOf(f, item, a), status);
}

int zrnSetItemAxisEqD2(ZrnFile& f, int item, int nx, int ny, double x0, double y0, double dx,
                       double dy, int* status) {
  ZrnSpatialAxis a;
  a.type = kZrnAxisD2;
  a.n = {nx, ny, 1};
  a.x0 = {x0, y0, 0};
  a.dx = {dx, dy, 1};
  return Finish(f, SetAxisOf(f, item, a), status);
}

int zrnSetItemAxisEqD3(ZrnFile& f, int item, int nx, int ny, int nz, double x0, double y0,
                       double z0, double dx, double dy, double dz, int* status) {
  ZrnSpatialAxis a;
  a.type = kZrnAxisD3;
  a.n = {nx, ny, nz};
  a.x0 = {x0, y0, z0};
  a.dx = {dx, dy, dz};
  return Finish(f, SetAxisOf(f, item, a), status);
}

int zrnSetItemAxisEqD4(ZrnFile& f, int item, int location, int n, int* status) {
  ZrnSpatialAxis a;
  a.type = kZrnAxisD4;
  a.n = {n, 1, 1};
  a.location = location;
  return Finish(f, SetAxisOf(f, item, a), status);
}

int zrnItemEnableCompression(ZrnFile& f, int item, int level, int* status) {
  int code = kZrnOk;
  ZrnItemInfo* it = WritableItem(f, item, code);
  if (it == nullptr) return Finish(f, code, status);
  if (level < 0 || level > 9)
    return Finish(f, Fail(f, kZrnErrItem, "compression level " + std::to_string(level)), status);
  it->compression = level;
  return Finish(f, kZrnOk, status);
}

int zrnGetNoOfItems(const ZrnFile& f, int& nitems, int* status) {
  nitems = static_cast<int>(f.items.size());
  return Finish(f, kZrnOk, status);
}

int zrnGetItemInfo(const ZrnFile& f, int item, std::string& name, int& item_type, int& unit,
                   int& value_type, int* status) {
  const ZrnItemInfo* it = ReadableItem(f, item);
  if (it == nullptr)
    return Finish(f.name, "item " + std::to_string(item), kZrnErrItemNumber, status);
  name = it->name;
  item_type = it->item_type;
  unit = it->unit;
  value_type = it->value_type;
  return Finish(f, kZrnOk, status);
}

int zrnGetItemAxisType(const ZrnFile& f, int item, int& axis_type, int* status) {
  const ZrnItemInfo* it = ReadableItem(f, item);
  if (it == nullptr)
    return Finish(f.name, "item " + std::to_string(item), kZrnErrItemNumber, status);
  axis_type = it->axis.type;
  return Finish(f, kZrnOk, status);
}

int zrnGetItemDim(const ZrnFile& f, int item, ZrnSpatialAxis& axis, int* status) {
  const ZrnItemInfo* it = ReadableItem(f, item);
  if (it == nullptr)
    return Finish(f.name, "item " + std::to_string(item), kZrnErrItemNumber, status);
  axis = it->axis;
  return Finish(f, kZrnOk, status);
}

}  // namespace vhd
