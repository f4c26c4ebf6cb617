// Projections: exact references on the central meridian, round trips, the
// angle to true north, and refusals.

#include <gtest/gtest.h>

#include <cmath>

#include "mesh/cartography.hpp"
#include "mesh_support.hpp"

namespace vhd {
namespace {

constexpr double kPi = 3.14159265358979323846;
constexpr double kRad = kPi / 180.0;

// Length of the WGS 84 meridian from the equator to latitude phi (degrees),
// integrated with Simpson's rule: an independent reference for the northing on
// the central meridian of a transverse Mercator zone.
double MeridianArc(double phi_deg) {
  const double a = 6378137.0, f = 1.0 / 298.257223563, e2 = f * (2.0 - f);
  const int n = 2000;
  const double h = phi_deg * kRad / n;
  double sum = 0.0;
  for (int i = 0; i <= n; ++i) {
    double s = std::sin(i * h);
    double m = a * (1.0 - e2) / std::pow(1.0 - e2 * s * s, 1.5);
    sum += (i == 0 || i == n ? 1.0 : (i % 2 ? 4.0 : 2.0)) * m;
  }
  return sum * h / 3.0;
}

TEST(Cartography, UtmCentralMeridianMatchesTheMeridianArc) {
  CTqCartography cart;
  TqCartCreate(cart, "UTM-32");
  for (double lat : {0.0, 30.0, 45.0, 56.5}) {
    double x = 0, y = 0;
    TqCartGeo2Proj(cart, 9.0, lat, x, y);
    EXPECT_NEAR(x, 500000.0, 1e-6);
    EXPECT_NEAR(y, 0.9996 * MeridianArc(lat), 1e-3) << "latitude " << lat;
  }
}

TEST(Cartography, RoundTripsThroughProjectionAndLocalAxes) {
  CTqCartography cart;
  TqCartCreate(cart, "UTM-32", 600000.0, 6100000.0, 30.0);
  double lon = 0, lat = 0, x = 0, y = 0, px = 0, py = 0;
  TqCartGeo2Proj(cart, 11.3, 55.1, px, py);
  TqCartProj2Geo(cart, px, py, lon, lat);
  EXPECT_NEAR(lon, 11.3, 1e-9);
  EXPECT_NEAR(lat, 55.1, 1e-9);
  TqCartGeo2xy(cart, 11.3, 55.1, x, y);
  TqCartXy2Geo(cart, x, y, lon, lat);
  EXPECT_NEAR(lon, 11.3, 1e-9);
  EXPECT_NEAR(lat, 55.1, 1e-9);
  // The local y axis lies 30 degrees clockwise from grid north.
  TqCartXy2Proj(cart, 0.0, 100.0, px, py);
  EXPECT_NEAR(px - 600000.0, 50.0, 1e-9);
  EXPECT_NEAR(py - 6100000.0, 100.0 * std::cos(30.0 * kRad), 1e-9);
  TqCartProj2xy(cart, px, py, x, y);
  EXPECT_NEAR(x, 0.0, 1e-9);
  EXPECT_NEAR(y, 100.0, 1e-9);
}

// The angle turns an east/north vector into local components: a short step
// due north, projected point by point, points where the angle says.
TEST(Cartography, TrueNorthRotatesVectorsIntoLocalAxes) {
  for (double orientation : {0.0, 25.0, -140.0}) {
    CTqCartography cart;
    TqCartCreate(cart, "UTM-33", 400000.0, 6000000.0, orientation);
    const double lon = 17.5, lat = 54.2;
    double x1 = 0, y1 = 0, x2 = 0, y2 = 0, a = 0;
    TqCartGeo2xy(cart, lon, lat, x1, y1);
    TqCartGeo2xy(cart, lon, lat + 1e-5, x2, y2);
    TqCartGetTrueNorth(cart, x1, y1, a);
    const double len = std::hypot(x2 - x1, y2 - y1);
    // (u, v) = (0, 1): local components (sin a, cos a).
    EXPECT_NEAR((x2 - x1) / len, std::sin(a * kRad), 1e-6) << orientation;
    EXPECT_NEAR((y2 - y1) / len, std::cos(a * kRad), 1e-6) << orientation;
    double grid = 0;
    TqCartGetProjectionNorth(cart, x1, y1, grid);
    EXPECT_EQ(grid, -orientation);
  }
}

TEST(Cartography, LongLatIsTheIdentityWithNorthUp) {
  CTqCartography cart;
  TqCartCreate(cart, "LONG/LAT");
  double x = 0, y = 0, a = 1;
  TqCartGeo2Proj(cart, -3.5, 51.25, x, y);
  EXPECT_EQ(x, -3.5);
  EXPECT_EQ(y, 51.25);
  TqCartGetTrueNorth(cart, -3.5, 51.25, a);
  EXPECT_EQ(a, 0.0);
  EXPECT_EQ(TqCartGetProjectionName(cart), "WGS 84");
}

TEST(Cartography, NonUtmHasNoGeographicReference) {
  CTqCartography cart;
  int status = -1;
  TqCartCreate(cart, "NON-UTM", 10.0, 20.0, 90.0, &status);
  EXPECT_EQ(status, kCartOk);
  double x = 0, y = 0, a = 0;
  TqCartXy2Proj(cart, 1.0, 0.0, x, y, &status);
  EXPECT_EQ(status, kCartOk);
  EXPECT_NEAR(x, 10.0, 1e-12);
  EXPECT_NEAR(y, 19.0, 1e-12);
  TqCartGeo2Proj(cart, 1.0, 1.0, x, y, &status);
  EXPECT_EQ(status, kCartNoGeoReference);
  TqCartProj2Geo(cart, 1.0, 1.0, x, y, &status);
  EXPECT_EQ(status, kCartNoGeoReference);
  TqCartGetTrueNorth(cart, 1.0, 1.0, a, &status);
  EXPECT_EQ(status, kCartNoGeoReference);
  EXPECT_FATAL(TqCartProj2Geo(cart, 1.0, 1.0, x, y), "Fatal error: Bad call to TqCartProj2Geo");
  EXPECT_FATAL(TqCartGetTrueNorth(cart, 1.0, 1.0, a), "Fatal error: Bad call to TqCartGetTrueNorth");
}

TEST(Cartography, UnknownProjectionsAreRefused) {
  for (const char* text : {"FOO", "EPSG:99999", "UTM-61", "+proj=nonsense", "GEOGCS[broken"}) {
    CTqCartography cart;
    int status = 0;
    TqCartCreate(cart, text, 0, 0, 0, &status);
    EXPECT_EQ(status, kCartUnknownProjection) << text;
    EXPECT_FALSE(cart.established);
    double x = 0, y = 0;
    TqCartXy2Proj(cart, 0, 0, x, y, &status);
    EXPECT_EQ(status, kCartNotEstablished);
  }
  CTqCartography cart;
  EXPECT_FATAL(TqCartCreate(cart, "Amersfoort"), "Fatal error: Unable to establish projection: Amersfoort");
}

TEST(Cartography, PointOutsideTheProjectionFails) {
  CTqCartography cart;
  TqCartCreate(cart, "UTM-32");
  double x = 0, y = 0;
  int status = 0;
  TqCartGeo2Proj(cart, 99.0, 0.0, x, y, &status);  // 90 degrees from the central meridian
  EXPECT_EQ(status, kCartConversionFailed);
  TqCartGeo2Proj(cart, 9.0, 95.0, x, y, &status);
  EXPECT_EQ(status, kCartConversionFailed);
  TqCartProj2Geo(cart, 1e9, 0.0, x, y, &status);
  EXPECT_EQ(status, kCartConversionFailed);
  EXPECT_FATAL(TqCartGeo2xy(cart, 99.0, 0.0, x, y), "Fatal error: Bad call to TqCartGeo2xy");
}

TEST(Cartography, ProjectionFormsNameTheSameSystem) {
  EXPECT_TRUE(TqCartAreProjectionsIdentical("UTM-32", "EPSG:32632"));
  EXPECT_TRUE(TqCartAreProjectionsIdentical(" UTM-32  ", "+proj=utm +zone=32 +datum=WGS84"));
  EXPECT_TRUE(TqCartAreProjectionsIdentical("LONG/LAT", "EPSG:4326"));
  EXPECT_FALSE(TqCartAreProjectionsIdentical("UTM-32", "UTM-33"));
  EXPECT_FALSE(TqCartAreProjectionsIdentical("UTM-32", "NON-UTM"));
  EXPECT_TRUE(TqCartAreProjectionsIdentical("NON-UTM", "non-utm"));
  EXPECT_EQ(TqCartProjectionShortName("EPSG:32632"), "UTM-32");
  EXPECT_EQ(TqCartProjectionShortName("32733"), "UTM-33S");
  EXPECT_EQ(TqCartProjectionShortName("+proj=longlat +datum=WGS84"), "LONG/LAT");
  EXPECT_EQ(TqCartProjectionShortName("EPSG:25832"), "EPSG:25832");
  int status = 0;
  EXPECT_FALSE(TqCartAreProjectionsIdentical("UTM-32", "FOO", &status));
  EXPECT_EQ(status, kCartUnknownProjection);
  EXPECT_FATAL(TqCartProjectionShortName("FOO"), "Fatal error: Bad call to TqCartProjectionShortName");
}

TEST(Cartography, CrsInformationForDataFiles) {
  ProjectionCrs utm = ProjectionCrsInfo("UTM-32");
  EXPECT_TRUE(utm.known);
  EXPECT_EQ(utm.epsg, 32632);
  EXPECT_EQ(utm.name, "WGS 84 / UTM zone 32N");
  EXPECT_NE(utm.wkt.find("UTM zone 32N"), std::string::npos);
  EXPECT_EQ(utm.wkt1.rfind("PROJCS[", 0), 0u);
  // The WKT itself is a projection string naming the same system.
  EXPECT_TRUE(TqCartAreProjectionsIdentical(utm.wkt, "UTM-32"));
  EXPECT_EQ(TqCartProjectionShortName(utm.wkt1), "UTM-32");
  EXPECT_EQ(ProjectionCrsInfo("LONG/LAT").epsg, 4326);
  EXPECT_FALSE(ProjectionCrsInfo("NON-UTM").known);
  EXPECT_FALSE(ProjectionCrsInfo("nonsense").known);
  // A definition that matches no EPSG system exactly has none.
  ProjectionCrs local = ProjectionCrsInfo("+proj=tmerc +lat_0=0 +lon_0=7.3 +k=1 +x_0=0 +y_0=0 +ellps=GRS80");
  EXPECT_TRUE(local.known);
  EXPECT_EQ(local.epsg, 0);
}

}  // namespace
}  // namespace vhd
