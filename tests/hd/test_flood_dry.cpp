// Flooding and drying: the drying and wetting sequence, the hysteresis, clipping, face
// flooding and the settings.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "driver/Log.h"
#include "hd/FloodDry.h"
#include "mesh/Domain.h"
#include "setup/SetupFile.h"
#include "support/RandomMesh.h"
#include "support/TestSupport.h"

namespace {

// Three unit squares in a row: 1 | 2 | 3.
class FloodDry : public ::testing::Test {
 protected:
  void SetUp() override {
    ResetMeshTables();
    tavrintest::RandomMeshSpec spec;
    spec.nx = 3;
    spec.ny = 1;
    spec.jitter = 0.0;
    spec.quadFraction = 1.0;
    tavrintest::MakeRandomMesh(spec, mesh_);
    ASSERT_EQ(mesh_.elements.numElements, 3);
    state_.numElements = 3;
    state_.wet = wet_.data();
    state_.wetOld = old_.data();
    state_.h = h_.data();
    state_.d = d_.data();
    state_.p = p_.data();
    state_.q = q_.data();
    state_.volumeCorrection = vol_.data();
  }
  void TearDown() override { ResetMeshTables(); }
  std::int32_t Check() { return CheckFloodDryHD(on_, mesh_, state_); }

  MeshData mesh_;
  FloodDrySettings on_{1, 0.005, 0.05, 0.1, 10};
  std::vector<std::int32_t> wet_ = std::vector<std::int32_t>(4, kDry), old_ = wet_;
  std::vector<double> h_ = std::vector<double>(4, 0.0), d_ = std::vector<double>(4, 1.0),
                      p_ = h_, q_ = h_, vol_ = h_;
  FloodDryState state_;
};

FloodDrySettings Read(const std::string& hd) {
  tavrintest::TempDir dir;
  SkfOpenFile(dir.write("c.skf", "TesselHD {\n HYDRODYNAMIC_MODULE {\n" + hd + "\n }\n}\n"), false);
  EXPECT_TRUE(LogOpen(dir.file("c.log")));
  SkfOpenTarget("TesselHD");
  SkfOpenSection("HYDRODYNAMIC_MODULE");
  FloodDrySettings s;
  ReadFloodDrySettings(s);
  SkfCloseSection();
  LogClose();
  SkfCloseFile();
  return s;
}

}  // namespace

TEST_F(FloodDry, DryingWettingAndHysteresis) {
  // Drying: wet at 0.2 m, flooded at 0.09 m (fluxes dropped at once), dry at 0.004 m. The
  // neighbours' beds lie above element 2's water level, so they stay dry.
  d_[1] = d_[3] = 0.1;
  wet_[2] = kWet;
  h_[2] = 0.2;
  p_[2] = q_[2] = 0.3;
  EXPECT_EQ(Check(), 1);
  EXPECT_EQ(wet_[2], kWet);
  EXPECT_EQ(p_[2], 0.3);
  h_[2] = 0.09;
  Check();
  EXPECT_EQ(wet_[2], kFlooded);
  EXPECT_EQ(p_[2], 0.0);
  EXPECT_EQ(q_[2], 0.0);
  h_[2] = 0.004;
  Check();
  EXPECT_EQ(wet_[2], kDry);
  // A negative depth of a drying element is clipped and the volume recorded.
  wet_[2] = kFlooded;
  h_[2] = -0.001;
  EXPECT_EQ(Check(), 1);  // no element is wet: at least 1
  EXPECT_EQ(wet_[2], kDry);
  EXPECT_EQ(h_[2], 0.0);
  EXPECT_NEAR(vol_[2], 0.001 * mesh_.elements.area[2], 1e-15);
  EXPECT_NEAR(SumVolumeCorrection(state_), 0.001, 1e-15);
  Check();
  EXPECT_EQ(vol_[2], 0.0);  // zeroed at every check

  // Hysteresis: between the drying and the mass depth every state ends flooded.
  for (const std::int32_t before : {kDry, kWet, kFlooded}) {
    wet_[2] = before;
    h_[2] = 0.05;
    Check();
    EXPECT_EQ(wet_[2], kFlooded) << before;
  }
  // Rewetting on its own water: more than the mass depth.
  wet_[2] = kDry;
  h_[2] = 0.11;
  Check();
  EXPECT_EQ(wet_[2], kWet);
}

TEST_F(FloodDry, DryElementsFloodFromHighNeighbours) {
  auto reset = [&](double h1, double d1, double d2) {
    std::fill(wet_.begin(), wet_.end(), kDry);
    std::fill(h_.begin(), h_.end(), 0.0);
    wet_[1] = kWet;
    h_[1] = h1;
    d_[1] = d1;
    d_[2] = d2;
  };
  reset(0.06, 1.0, 1.0);  // more than the flooding depth, level above the bed of 2
  EXPECT_EQ(Check(), 2);
  EXPECT_EQ(wet_[2], kFlooded);
  EXPECT_EQ(wet_[3], kDry);  // 3 is not next to 1, and 2 holds no water yet
  reset(0.04, 1.0, 1.0);     // too little water
  Check();
  EXPECT_EQ(wet_[2], kDry);
  reset(0.11, 1.0, 0.5);     // water level below the neighbour's bed
  Check();
  EXPECT_EQ(wet_[2], kDry);
  // The other direction: a wet right element floods its dry left neighbour.
  std::fill(wet_.begin(), wet_.end(), kDry);
  std::fill(h_.begin(), h_.end(), 0.0);
  std::fill(d_.begin(), d_.end(), 1.0);
  wet_[3] = kWet;
  h_[3] = 0.5;
  Check();
  EXPECT_EQ(wet_[2], kFlooded);

  // Off: every element keeps its state whatever its depth.
  FloodDrySettings off;
  off.type = 0;
  std::fill(wet_.begin(), wet_.end(), kWet);
  h_[1] = -0.5;
  vol_[1] = 7.0;
  EXPECT_EQ(CheckFloodDryHD(off, mesh_, state_), 3);
  EXPECT_EQ(wet_[1], kWet);
  EXPECT_EQ(vol_[1], 0.0);

  // Initial classification.
  h_[1] = -0.2;
  h_[2] = 0.05;
  h_[3] = 2.0;
  ClassifyFloodDryInitial(on_, state_);
  EXPECT_EQ(wet_[1], kDry);
  EXPECT_EQ(h_[1], 0.0);
  EXPECT_EQ(wet_[2], kFlooded);
  EXPECT_EQ(wet_[3], kWet);
}

TEST(FloodDrySettingsRead, DefaultsOffAndRefusals) {
  const FloodDrySettings none = Read("");
  EXPECT_EQ(none.type, 0);
  EXPECT_EQ(none.massDepth, 0.0);
  const FloodDrySettings on = Read("FLOOD_AND_DRY { type = 1 }");
  EXPECT_EQ(on.dryingDepth, 0.005);
  EXPECT_EQ(on.floodingDepth, 0.05);
  EXPECT_EQ(on.massDepth, 0.1);
  EXPECT_EQ(on.maxIterations, 10);
  const FloodDrySettings off = Read("FLOOD_AND_DRY { type = 0\n drying_depth = 0.2 }");
  EXPECT_EQ(off.dryingDepth, 0.0);
  EXPECT_EXIT(Read("FLOOD_AND_DRY { type = 1\n drying_depth = -0.1 }"),
              ::testing::ExitedWithCode(1), "must not be negative");
  EXPECT_EXIT(Read("FLOOD_AND_DRY { type = 1\n drying_depth = 0.2 }"),
              ::testing::ExitedWithCode(1), "must not exceed");
  EXPECT_EXIT(Read("FLOOD_AND_DRY { type = 1\n maximum_number_of_iterations = 0 }"),
              ::testing::ExitedWithCode(1), "maximum_number_of_iterations < 1");
}
