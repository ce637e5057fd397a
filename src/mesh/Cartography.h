// Cartography of a mesh: the projection origin and conversions between geographic coordinates
// (WGS 84 longitude/latitude, degrees) and the mesh's projected coordinates, through PROJ.
//
// Projection texts: "LONG/LAT" (the mesh is geographic; conversions are the identity),
// "NON-UTM" (plain Cartesian coordinates without a map projection; geographic conversions are
// refused), "UTM-<zone>" (WGS 84 / UTM zone, northern hemisphere: southern-hemisphere meshes
// use "UTM-<zone>" with negative northings, or an explicit "EPSG:327zz"), and anything PROJ
// accepts (WKT, "EPSG:nnnn", PROJ strings). Coordinates are always in the order x = easting or
// longitude, y = northing or latitude, whatever axis order the CRS itself declares.
//
// One object per mesh, shared read-only by all threads: each thread uses its own PROJ context
// and transformation, created on first use and released with the object.
#pragma once

#include <memory>
#include <string>

class Cartography {
 public:
  // Throws MeshError("Unknown projection \"<text>\": <reason>") when the text is not understood.
  explicit Cartography(const std::string& projection);
  ~Cartography();
  Cartography(const Cartography&) = delete;
  Cartography& operator=(const Cartography&) = delete;

  const std::string& Projection() const;
  bool IsGeographic() const;  // "LONG/LAT" or another geographic CRS: coordinates are degrees
  bool IsCartesian() const;   // "NON-UTM": no geographic conversions
  // Projection origin: longitude and latitude (degrees) of the natural origin of the projected
  // CRS's map projection (of the false origin or projection centre where the method has no
  // natural origin); 0, 0 for geographic and Cartesian meshes and projections without one.
  double OriginX() const;
  double OriginY() const;

  // Geographic (degrees) to projected (metres) and back; false when the point cannot be
  // converted (outside the projection's domain, or a "NON-UTM" mesh). Thread-safe.
  bool GeoToProj(double lon, double lat, double& x, double& y) const;
  bool ProjToGeo(double x, double y, double& lon, double& lat) const;
  // Meridian convergence at a projected point: the angle (radians) from true north to grid
  // north, positive clockwise, i.e. positive where grid north lies east of true north (for UTM:
  // east of the central meridian in the northern hemisphere). A direction given as an azimuth
  // from true north has the grid bearing azimuth - angle. 0 for geographic meshes; false (and
  // 0) for "NON-UTM" and points that cannot be converted.
  bool MeridianConvergence(double x, double y, double& angle) const;

 private:
  struct Impl;
  std::unique_ptr<Impl> impl_;
};

// Origin of a projection text (two values, see Cartography::OriginX/Y); false with `error`
// set ("Unknown projection ...") when the text is not understood.
bool CartGetOrigin(const std::string& projection, double& x, double& y, std::string& error);
