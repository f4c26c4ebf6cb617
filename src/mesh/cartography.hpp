#pragma once
// Cartography: map projections, local coordinate systems and north directions.
//
// Three coordinate systems meet here:
//   geo   geographic longitude and latitude in degrees, on the geodetic datum of
//         the projection (no datum shift is ever applied);
//   proj  coordinates of the map projection (easting, northing; for "LONG/LAT"
//         they are longitude and latitude in degrees, as in the files);
//   xy    local coordinates: proj coordinates shifted to an origin and turned
//         by an orientation. The local y axis lies `orientation` degrees
//         clockwise from grid north, so
//           easting  = x0 + x cos(o) + y sin(o)
//           northing = y0 - x sin(o) + y cos(o).
// Meshes in "LONG/LAT" hold radians; callers convert to degrees before calling.
//
// Projection strings:
//   "LONG/LAT"   geographic WGS 84 (longitude first);
//   "UTM-NN"     WGS 84 / UTM zone NN north (NN = 1 .. 60; "UTM-NNS" south);
//   "NON-UTM"    local coordinates with no geographic reference: xy <-> proj
//                works, every conversion to or from geo fails;
//   otherwise    what PROJ knows as a coordinate reference system: an
//                authority code ("EPSG:25832", or the bare number), a PROJ
//                string ("+proj=utm +zone=32 +datum=WGS84"), WKT or PROJJSON.
//                Bare names are refused: PROJ would match them loosely against
//                its database and pick an unrelated system.
//
// Directions are degrees clockwise. Meridian convergence gamma is the angle
// from true north to grid north (positive when grid north lies east of true
// north: east of the central meridian of a northern UTM zone).
//
// Thread safety: every object owns its own PROJ context; one object must not be
// used by two threads at once. Objects are made at setup, on the main thread.
//
// Every wrapper takes an optional status. With a status the library's code goes
// there (0 = success); without one a non-zero code is the fatal error
// "Bad call to " + the wrapper's name.

#include <string>
#include <string_view>

struct pj_ctx;
struct PJconsts;

namespace vhd {

// Codes of the cartography library.
inline constexpr int kCartOk = 0;
inline constexpr int kCartNotEstablished = 1;   // object without a projection
inline constexpr int kCartNoGeoReference = 2;   // "NON-UTM": no geographic reference
inline constexpr int kCartConversionFailed = 3; // PROJ failed (point outside the domain)
inline constexpr int kCartUnknownProjection = 4;

// One map projection made from a projection string. Owns its PROJ objects.
class CTqMapProjection {
public:
  enum class Kind { None, Geographic, Projected, Local };

  CTqMapProjection() = default;
  ~CTqMapProjection();
  CTqMapProjection(CTqMapProjection&& other) noexcept;
  CTqMapProjection& operator=(CTqMapProjection&& other) noexcept;
  CTqMapProjection(const CTqMapProjection&) = delete;
  CTqMapProjection& operator=(const CTqMapProjection&) = delete;

  // Builds the projection; returns kCartOk or kCartUnknownProjection, with
  // PROJ's reason in *reason when given.
  int Establish(std::string_view projection, std::string* reason = nullptr);

  Kind kind() const { return kind_; }
  const std::string& text() const { return text_; }
  // PROJ's name of the system ("WGS 84 / UTM zone 32N"); "NON-UTM" for local.
  std::string Name() const;
  // "LONG/LAT", "UTM-NN[S]", "NON-UTM", "EPSG:code", or the PROJ name.
  std::string ShortName() const;
  // EPSG code of the system when PROJ knows one, else 0.
  int EpsgCode() const;
  // WKT of the system (version 2 (2019) or version 1 as GDAL writes it);
  // empty for a local system.
  std::string Wkt(bool version1 = false) const;
  bool IsEquivalentTo(const CTqMapProjection& other) const;

  int Geo2Proj(double lon, double lat, double& x, double& y) const;
  int Proj2Geo(double x, double y, double& lon, double& lat) const;
  // Meridian convergence (degrees) at a geographic point.
  int Convergence(double lon, double lat, double& gamma) const;

private:
  void Release();

  Kind kind_ = Kind::None;
  std::string text_;
  int utm_zone_ = 0;  // > 0 for "UTM-NN" (north), < 0 for "UTM-NNS"
  pj_ctx* ctx_ = nullptr;
  PJconsts* crs_ = nullptr;        // the coordinate reference system
  PJconsts* geo_to_proj_ = nullptr;  // geo (lon, lat degrees) -> proj (x, y)
};

// A map projection with the origin and orientation of a local system.
class CTqCartography {
public:
  CTqMapProjection projection;
  double origin_x = 0.0;     // proj coordinates of the local origin
  double origin_y = 0.0;
  double orientation = 0.0;  // local y axis, degrees clockwise from grid north
  bool established = false;

  void Xy2Proj(double x, double y, double& px, double& py) const;
  void Proj2Xy(double px, double py, double& x, double& y) const;
};

// Creates the object from a projection string, an origin (proj coordinates) and
// an orientation. Failure without status: "Unable to establish projection: "
// followed by the string.
void TqCartCreate(CTqCartography& cart, std::string_view projection, double origin_x = 0.0,
                  double origin_y = 0.0, double orientation = 0.0, int* status = nullptr);

void TqCartGetOrigin(const CTqCartography& cart, double& origin_x, double& origin_y,
                     double& orientation, int* status = nullptr);
void TqCartGeo2Proj(const CTqCartography& cart, double lon, double lat, double& x, double& y,
                    int* status = nullptr);
void TqCartProj2Geo(const CTqCartography& cart, double x, double y, double& lon, double& lat,
                    int* status = nullptr);
void TqCartXy2Geo(const CTqCartography& cart, double x, double y, double& lon, double& lat,
                  int* status = nullptr);
void TqCartGeo2xy(const CTqCartography& cart, double lon, double lat, double& x, double& y,
                  int* status = nullptr);
void TqCartXy2Proj(const CTqCartography& cart, double x, double y, double& px, double& py,
                   int* status = nullptr);
void TqCartProj2xy(const CTqCartography& cart, double px, double py, double& x, double& y,
                   int* status = nullptr);
std::string TqCartGetProjectionName(const CTqCartography& cart, int* status = nullptr);
std::string TqCartGetProjectionString(const CTqCartography& cart, int* status = nullptr);
// Direction of true north at the local point (x, y), degrees clockwise from the
// local y axis. A vector (u, v) in east/north components has the local
// components u cos(a) + v sin(a), v cos(a) - u sin(a) with a this angle.
void TqCartGetTrueNorth(const CTqCartography& cart, double x, double y, double& angle,
                        int* status = nullptr);
// Direction of grid north at the local point, degrees clockwise from the local
// y axis (the negative orientation).
void TqCartGetProjectionNorth(const CTqCartography& cart, double x, double y, double& angle,
                              int* status = nullptr);
// Short, canonical name of a projection string: "UTM-32" for "EPSG:32632" too.
std::string TqCartProjectionShortName(std::string_view projection, int* status = nullptr);
// True when the two strings name the same system ("UTM-32" and "EPSG:32632").
bool TqCartAreProjectionsIdentical(std::string_view a, std::string_view b, int* status = nullptr);

// What a data file's grid-mapping variable needs.
struct ProjectionCrs {
  bool known = false;  // false for "NON-UTM" or a string PROJ does not know
  std::string wkt;     // WKT2 (2019)
  std::string wkt1;    // WKT1 as GDAL writes it
  int epsg = 0;        // 0 when PROJ knows no EPSG code
  std::string name;
};
ProjectionCrs ProjectionCrsInfo(std::string_view projection);

// True for "NON-UTM" (blanks around and letter case ignored).
bool IsNonUtm(std::string_view projection);

}  // namespace vhd
