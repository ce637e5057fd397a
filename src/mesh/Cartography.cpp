// Placeholder until the PROJ conversions land: only the texts the engine knows by name.
#include "mesh/Cartography.h"

#include "mesh/MeshData.h"

struct Cartography::Impl {
  std::string projection;
};

Cartography::Cartography(const std::string& projection) : impl_(std::make_unique<Impl>()) {
  impl_->projection = projection;
}
Cartography::~Cartography() = default;
const std::string& Cartography::Projection() const { return impl_->projection; }
bool Cartography::IsGeographic() const { return impl_->projection == "LONG/LAT"; }
bool Cartography::IsCartesian() const { return impl_->projection == "NON-UTM"; }
double Cartography::OriginX() const { return 0.0; }
double Cartography::OriginY() const { return 0.0; }
bool Cartography::GeoToProj(double, double, double&, double&) const { return false; }
bool Cartography::ProjToGeo(double, double, double&, double&) const { return false; }
bool Cartography::MeridianConvergence(double, double, double& angle) const { angle = 0.0; return true; }
bool CartGetOrigin(const std::string&, double& x, double& y, std::string&) { x = y = 0.0; return true; }
