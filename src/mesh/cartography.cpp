#include "mesh/cartography.hpp"

#include <proj.h>

#include <cctype>
#include <cmath>
#include <utility>

#include "log/log.hpp"

namespace vhd {

namespace {

constexpr double kDegToRad = 0.017453292519943295;

std::string_view Trim(std::string_view s) {
  while (!s.empty() && std::isspace(static_cast<unsigned char>(s.front()))) s.remove_prefix(1);
  while (!s.empty() && std::isspace(static_cast<unsigned char>(s.back()))) s.remove_suffix(1);
  return s;
}

bool EqualNoCase(std::string_view a, std::string_view b) {
  if (a.size() != b.size()) return false;
  for (std::size_t i = 0; i < a.size(); ++i) {
    if (std::toupper(static_cast<unsigned char>(a[i])) != std::toupper(static_cast<unsigned char>(b[i])))
      return false;
  }
  return true;
}

bool AllDigits(std::string_view s) {
  if (s.empty()) return false;
  for (char c : s)
    if (!std::isdigit(static_cast<unsigned char>(c))) return false;
  return true;
}

// "UTM-NN" or "UTM-NNS": zone, negative for the southern hemisphere; 0 when the
// string is not of that form.
int ParseUtmZone(std::string_view s) {
  if (s.size() < 5 || !EqualNoCase(s.substr(0, 4), "UTM-")) return 0;
  std::string_view rest = s.substr(4);
  int sign = 1;
  char last = static_cast<char>(std::toupper(static_cast<unsigned char>(rest.back())));
  if (last == 'S' || last == 'N') {
    sign = last == 'S' ? -1 : 1;
    rest.remove_suffix(1);
  }
  if (!AllDigits(rest) || rest.size() > 2) return 0;
  int zone = std::stoi(std::string(rest));
  return zone >= 1 && zone <= 60 ? sign * zone : 0;
}

// "AUTH:CODE" (letters, digits, '_' and '-' before the colon, a non-empty code).
bool IsAuthorityCode(std::string_view s) {
  std::size_t colon = s.find(':');
  if (colon == 0 || colon == std::string_view::npos || colon + 1 >= s.size()) return false;
  for (std::size_t i = 0; i < colon; ++i) {
    char c = s[i];
    if (!std::isalnum(static_cast<unsigned char>(c)) && c != '_' && c != '-') return false;
  }
  for (char c : s)
    if (std::isspace(static_cast<unsigned char>(c))) return false;
  return true;
}

// The text handed to proj_create, or empty when the string is of no form we
// accept (bare names are refused on purpose).
std::string ProjDefinition(std::string_view s) {
  if (AllDigits(s)) return "EPSG:" + std::string(s);
  if (s.front() == '+' || s.starts_with("proj=")) {
    std::string def(s);
    if (def.find("type=crs") == std::string::npos) def += " +type=crs";
    return def;
  }
  if (s.front() == '{' || s.find('[') != std::string_view::npos) return std::string(s);
  if (IsAuthorityCode(s)) return std::string(s);
  return {};
}

std::string ContextError(PJ_CONTEXT* ctx) {
  int err = proj_context_errno(ctx);
  const char* text = err != 0 ? proj_context_errno_string(ctx, err) : nullptr;
  return text ? std::string(text) : std::string("not a coordinate reference system");
}

int Report(int code, int* status, const char* wrapper) {
  if (status) {
    *status = code;
  } else if (code != kCartOk) {
    FatalError(std::string("Bad call to ") + wrapper);
  }
  return code;
}

}  // namespace

// ---- CTqMapProjection ----------------------------------------------------------

CTqMapProjection::~CTqMapProjection() { Release(); }

CTqMapProjection::CTqMapProjection(CTqMapProjection&& other) noexcept { *this = std::move(other); }

CTqMapProjection& CTqMapProjection::operator=(CTqMapProjection&& other) noexcept {
  if (this != &other) {
    Release();
    kind_ = std::exchange(other.kind_, Kind::None);
    text_ = std::move(other.text_);
    utm_zone_ = std::exchange(other.utm_zone_, 0);
    ctx_ = std::exchange(other.ctx_, nullptr);
    crs_ = std::exchange(other.crs_, nullptr);
    geo_to_proj_ = std::exchange(other.geo_to_proj_, nullptr);
  }
  return *this;
}

void CTqMapProjection::Release() {
  if (geo_to_proj_) proj_destroy(geo_to_proj_);
  if (crs_) proj_destroy(crs_);
  if (ctx_) proj_context_destroy(ctx_);
  geo_to_proj_ = nullptr;
  crs_ = nullptr;
  ctx_ = nullptr;
  kind_ = Kind::None;
  utm_zone_ = 0;
}

int CTqMapProjection::Establish(std::string_view projection, std::string* reason) {
  Release();
  std::string_view s = Trim(projection);
  text_ = std::string(s);
  if (EqualNoCase(s, "NON-UTM")) {
    kind_ = Kind::Local;
    return kCartOk;
  }
  std::string def;
  if (EqualNoCase(s, "LONG/LAT")) {
    def = "EPSG:4326";
  } else if (int zone = ParseUtmZone(s); zone != 0) {
    utm_zone_ = zone;
    def = "EPSG:" + std::to_string(zone > 0 ? 32600 + zone : 32700 - zone);
  } else if (!s.empty()) {
    def = ProjDefinition(s);
  }
  if (def.empty()) {
    if (reason) *reason = "not an authority code, PROJ string or WKT";
    return kCartUnknownProjection;
  }

  ctx_ = proj_context_create();
  proj_log_level(ctx_, PJ_LOG_NONE);
  proj_context_set_enable_network(ctx_, 0);
  auto fail = [&](std::string why) {
    if (reason) *reason = std::move(why);
    Release();
    return kCartUnknownProjection;
  };
  crs_ = proj_create(ctx_, def.c_str());
  if (!crs_) return fail(ContextError(ctx_));
  if (proj_get_type(crs_) == PJ_TYPE_COMPOUND_CRS) {
    PJ* horizontal = proj_crs_get_sub_crs(ctx_, crs_, 0);
    proj_destroy(crs_);
    crs_ = horizontal;
    if (!crs_) return fail(ContextError(ctx_));
  }
  PJ_TYPE type = proj_get_type(crs_);
  if (type == PJ_TYPE_GEOGRAPHIC_2D_CRS || type == PJ_TYPE_GEOGRAPHIC_3D_CRS) {
    kind_ = Kind::Geographic;
    return kCartOk;
  }
  if (type != PJ_TYPE_PROJECTED_CRS) return fail("not a geographic or projected coordinate reference system");

  PJ* geodetic = proj_crs_get_geodetic_crs(ctx_, crs_);
  if (!geodetic) return fail(ContextError(ctx_));
  PJ* op = proj_create_crs_to_crs_from_pj(ctx_, geodetic, crs_, nullptr, nullptr);
  proj_destroy(geodetic);
  if (!op) return fail(ContextError(ctx_));
  geo_to_proj_ = proj_normalize_for_visualization(ctx_, op);
  proj_destroy(op);
  if (!geo_to_proj_) return fail(ContextError(ctx_));
  kind_ = Kind::Projected;
  return kCartOk;
}

std::string CTqMapProjection::Name() const {
  if (kind_ == Kind::Local) return "NON-UTM";
  if (!crs_) return {};
  const char* name = proj_get_name(crs_);
  return name ? name : text_;
}

int CTqMapProjection::EpsgCode() const {
  if (!crs_) return 0;
  const char* auth = proj_get_id_auth_name(crs_, 0);
  const char* code = proj_get_id_code(crs_, 0);
  if (auth && code && std::string_view(auth) == "EPSG" && AllDigits(code)) return std::stoi(code);
  // A definition without an identifier (a PROJ string or WKT without ids):
  // accept PROJ's identification only when it names exactly one system.
  int* confidence = nullptr;
  PJ_OBJ_LIST* list = proj_identify(ctx_, crs_, "EPSG", nullptr, &confidence);
  int result = 0;
  if (list && proj_list_get_count(list) == 1 && confidence && confidence[0] >= 70) {
    PJ* match = proj_list_get(ctx_, list, 0);
    const char* c = match ? proj_get_id_code(match, 0) : nullptr;
    if (c && AllDigits(c)) result = std::stoi(c);
    if (match) proj_destroy(match);
  }
  if (confidence) proj_int_list_destroy(confidence);
  if (list) proj_list_destroy(list);
  return result;
}

std::string CTqMapProjection::ShortName() const {
  switch (kind_) {
    case Kind::None: return {};
    case Kind::Local: return "NON-UTM";
    default: break;
  }
  int epsg = EpsgCode();
  if (epsg == 4326) return "LONG/LAT";
  if (epsg > 32600 && epsg <= 32660) return "UTM-" + std::to_string(epsg - 32600);
  if (epsg > 32700 && epsg <= 32760) return "UTM-" + std::to_string(epsg - 32700) + "S";
  if (epsg > 0) return "EPSG:" + std::to_string(epsg);
  return Name();
}

std::string CTqMapProjection::Wkt(bool version1) const {
  if (!crs_) return {};
  const char* options[] = {"MULTILINE=NO", nullptr};
  const char* wkt = proj_as_wkt(ctx_, crs_, version1 ? PJ_WKT1_GDAL : PJ_WKT2_2019, options);
  return wkt ? wkt : std::string();
}

bool CTqMapProjection::IsEquivalentTo(const CTqMapProjection& other) const {
  if (kind_ == Kind::None || other.kind_ == Kind::None) return false;
  if (kind_ == Kind::Local || other.kind_ == Kind::Local) return kind_ == other.kind_;
  return proj_is_equivalent_to_with_ctx(ctx_, crs_, other.crs_,
                                        PJ_COMP_EQUIVALENT_EXCEPT_AXIS_ORDER_GEOGCRS) != 0;
}

int CTqMapProjection::Geo2Proj(double lon, double lat, double& x, double& y) const {
  switch (kind_) {
    case Kind::None: return kCartNotEstablished;
    case Kind::Local: return kCartNoGeoReference;
    case Kind::Geographic:
      x = lon;
      y = lat;
      return kCartOk;
    case Kind::Projected: break;
  }
  proj_errno_reset(geo_to_proj_);
  PJ_COORD c = proj_trans(geo_to_proj_, PJ_FWD, proj_coord(lon, lat, 0, 0));
  if (proj_errno(geo_to_proj_) != 0 || !std::isfinite(c.xy.x) || !std::isfinite(c.xy.y))
    return kCartConversionFailed;
  x = c.xy.x;
  y = c.xy.y;
  return kCartOk;
}

int CTqMapProjection::Proj2Geo(double x, double y, double& lon, double& lat) const {
  switch (kind_) {
    case Kind::None: return kCartNotEstablished;
    case Kind::Local: return kCartNoGeoReference;
    case Kind::Geographic:
      lon = x;
      lat = y;
      return kCartOk;
    case Kind::Projected: break;
  }
  proj_errno_reset(geo_to_proj_);
  PJ_COORD c = proj_trans(geo_to_proj_, PJ_INV, proj_coord(x, y, 0, 0));
  if (proj_errno(geo_to_proj_) != 0 || !std::isfinite(c.lp.lam) || !std::isfinite(c.lp.phi))
    return kCartConversionFailed;
  lon = c.lp.lam;
  lat = c.lp.phi;
  return kCartOk;
}

int CTqMapProjection::Convergence(double lon, double lat, double& gamma) const {
  switch (kind_) {
    case Kind::None: return kCartNotEstablished;
    case Kind::Local: return kCartNoGeoReference;
    case Kind::Geographic:
      gamma = 0.0;
      return kCartOk;
    case Kind::Projected: break;
  }
  // The direction of true north in the projection, from the image of a short
  // step along the meridian (central difference). Asking PROJ for the scale
  // factors of the CRS instead would look the conversion up in its database
  // anew at every call, some 10^8 instructions each.
  const double step = 1e-5;  // degrees of latitude, about 1 m
  double x1, y1, x2, y2;
  if (Geo2Proj(lon, lat - step, x1, y1) != kCartOk || Geo2Proj(lon, lat + step, x2, y2) != kCartOk)
    return kCartConversionFailed;
  if (!std::isfinite(x1) || !std::isfinite(x2) || (x1 == x2 && y1 == y2)) return kCartConversionFailed;
  // Positive where grid north lies east of true north (east of the central
  // meridian of a transverse Mercator projection in the northern hemisphere).
  gamma = std::atan2(-(x2 - x1), y2 - y1) / kDegToRad;
  return kCartOk;
}

// ---- CTqCartography ------------------------------------------------------------

void CTqCartography::Xy2Proj(double x, double y, double& px, double& py) const {
  double c = std::cos(orientation * kDegToRad), s = std::sin(orientation * kDegToRad);
  px = origin_x + x * c + y * s;
  py = origin_y - x * s + y * c;
}

void CTqCartography::Proj2Xy(double px, double py, double& x, double& y) const {
  double c = std::cos(orientation * kDegToRad), s = std::sin(orientation * kDegToRad);
  double dx = px - origin_x, dy = py - origin_y;
  x = dx * c - dy * s;
  y = dx * s + dy * c;
}

// ---- wrappers ---------------------------------------------------------------------

void TqCartCreate(CTqCartography& cart, std::string_view projection, double origin_x, double origin_y,
                  double orientation, int* status) {
  std::string reason;
  int code = cart.projection.Establish(projection, &reason);
  cart.origin_x = origin_x;
  cart.origin_y = origin_y;
  cart.orientation = orientation;
  cart.established = code == kCartOk;
  if (status) {
    *status = code;
    return;
  }
  if (code != kCartOk) {
    WriteLogLine("  PROJ: " + reason);
    FatalError("Unable to establish projection: " + std::string(Trim(projection)));
  }
}

void TqCartGetOrigin(const CTqCartography& cart, double& origin_x, double& origin_y, double& orientation,
                     int* status) {
  if (Report(cart.established ? kCartOk : kCartNotEstablished, status, "TqCartGetOrigin") != kCartOk) return;
  origin_x = cart.origin_x;
  origin_y = cart.origin_y;
  orientation = cart.orientation;
}

void TqCartGeo2Proj(const CTqCartography& cart, double lon, double lat, double& x, double& y, int* status) {
  Report(cart.projection.Geo2Proj(lon, lat, x, y), status, "TqCartGeo2Proj");
}

void TqCartProj2Geo(const CTqCartography& cart, double x, double y, double& lon, double& lat, int* status) {
  Report(cart.projection.Proj2Geo(x, y, lon, lat), status, "TqCartProj2Geo");
}

void TqCartXy2Geo(const CTqCartography& cart, double x, double y, double& lon, double& lat, int* status) {
  double px = 0, py = 0;
  cart.Xy2Proj(x, y, px, py);
  Report(cart.projection.Proj2Geo(px, py, lon, lat), status, "TqCartXy2Geo");
}

void TqCartGeo2xy(const CTqCartography& cart, double lon, double lat, double& x, double& y, int* status) {
  double px = 0, py = 0;
  int code = cart.projection.Geo2Proj(lon, lat, px, py);
  if (code == kCartOk) cart.Proj2Xy(px, py, x, y);
  Report(code, status, "TqCartGeo2xy");
}

void TqCartXy2Proj(const CTqCartography& cart, double x, double y, double& px, double& py, int* status) {
  if (Report(cart.established ? kCartOk : kCartNotEstablished, status, "TqCartXy2Proj") == kCartOk)
    cart.Xy2Proj(x, y, px, py);
}

void TqCartProj2xy(const CTqCartography& cart, double px, double py, double& x, double& y, int* status) {
  if (Report(cart.established ? kCartOk : kCartNotEstablished, status, "TqCartProj2xy") == kCartOk)
    cart.Proj2Xy(px, py, x, y);
}

std::string TqCartGetProjectionName(const CTqCartography& cart, int* status) {
  if (Report(cart.established ? kCartOk : kCartNotEstablished, status, "TqCartGetProjectionName") != kCartOk)
    return {};
  return cart.projection.Name();
}

std::string TqCartGetProjectionString(const CTqCartography& cart, int* status) {
  if (Report(cart.established ? kCartOk : kCartNotEstablished, status, "TqCartGetProjectionString") != kCartOk)
    return {};
  return cart.projection.text();
}

void TqCartGetTrueNorth(const CTqCartography& cart, double x, double y, double& angle, int* status) {
  double px = 0, py = 0, lon = 0, lat = 0, gamma = 0;
  cart.Xy2Proj(x, y, px, py);
  int code = cart.projection.Proj2Geo(px, py, lon, lat);
  if (code == kCartOk) code = cart.projection.Convergence(lon, lat, gamma);
  if (code == kCartOk) angle = -gamma - cart.orientation;
  Report(code, status, "TqCartGetTrueNorth");
}

void TqCartGetProjectionNorth(const CTqCartography& cart, double /*x*/, double /*y*/, double& angle,
                              int* status) {
  if (Report(cart.established ? kCartOk : kCartNotEstablished, status, "TqCartGetProjectionNorth") == kCartOk)
    angle = -cart.orientation;
}

std::string TqCartProjectionShortName(std::string_view projection, int* status) {
  CTqMapProjection p;
  if (Report(p.Establish(projection), status, "TqCartProjectionShortName") != kCartOk) return {};
  return p.ShortName();
}

bool TqCartAreProjectionsIdentical(std::string_view a, std::string_view b, int* status) {
  CTqMapProjection pa, pb;
  int code = pa.Establish(a);
  if (code == kCartOk) code = pb.Establish(b);
  if (Report(code, status, "TqCartAreProjectionsIdentical") != kCartOk) return false;
  return pa.IsEquivalentTo(pb);
}

ProjectionCrs ProjectionCrsInfo(std::string_view projection) {
  ProjectionCrs info;
  CTqMapProjection p;
  if (p.Establish(projection) != kCartOk || p.kind() == CTqMapProjection::Kind::Local) return info;
  info.known = true;
  info.wkt = p.Wkt(false);
  info.wkt1 = p.Wkt(true);
  info.epsg = p.EpsgCode();
  info.name = p.Name();
  return info;
}

bool IsNonUtm(std::string_view projection) { return EqualNoCase(Trim(projection), "NON-UTM"); }

}  // namespace vhd
