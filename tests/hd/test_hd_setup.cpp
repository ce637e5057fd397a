// Hydrodynamic set-up: the solution-technique defaults and their echo, the equation choices,
// the GPU refusals and the initial state with dry and flooded elements.
#include <gtest/gtest.h>

#include <string>

#include "driver/Log.h"
#include "hd/HDModule.h"
#include "mesh/Domain.h"
#include "setup/SetupFile.h"
#include "support/TestSupport.h"

namespace {

// Two triangles of a 10 m square; node 3 (10, 10) has its bed above the datum (+0.5 m).
const char* const kMesh =
    "4 NON-UTM\n1 0 0 -2 1\n2 10 0 -0.3 1\n3 10 10 0.5 1\n4 0 10 -2 1\n2 3 21\n1 1 2 4\n2 2 3 4\n";

class HDSetup : public ::testing::Test {
 protected:
  void SetUp() override { ResetMeshTables(); }
  void TearDown() override {
    if (LogIsOpen()) LogClose();
    if (open_) SkfCloseFile();
    ResetMeshTables();
  }
  // Reads DOMAIN and HYDRODYNAMIC_MODULE { body } with a 60 s overall step.
  HDModule Run(const std::string& body, bool gpu = false) {
    dir_.write("m.mesh", kMesh);
    const std::string setup = dir_.write(
        "case.skf", "TesselHD {\n DOMAIN {\n  file_name = \"m.mesh\"\n }\n HYDRODYNAMIC_MODULE {\n" +
                        body + "\n }\n}\n");
    SkfOpenFile(setup, false);
    open_ = true;
    EXPECT_TRUE(LogOpen(dir_.file("case.log")));
    SkfOpenTarget("TesselHD");
    DomainSettings domain;
    SetupSpaceDiscretization(domain);
    HDModule hd;
    SetupHD(hd, 2, 2, 0, 60.0, gpu);
    InitialStateHD(hd);
    return hd;
  }
  std::string Log() const { return tavrintest::ReadFile(dir_.file("case.log")); }
  tavrintest::TempDir dir_;
  bool open_ = false;
};

}  // namespace

TEST_F(HDSetup, SolutionTechniqueDefaultsAndEcho) {
  HDModule hd = Run("mode = 2");
  const SolutionMethodHD& sm = hd.solution;
  EXPECT_EQ(sm.timeOrder, 1);
  EXPECT_EQ(sm.spaceOrder, 1);
  EXPECT_EQ(sm.riemannSolver, 1);
  EXPECT_EQ(sm.entropyFix, 1);
  EXPECT_EQ(sm.cflHD, 1.0);
  EXPECT_EQ(sm.dtMaxHD, 60.0);
  EXPECT_EQ(sm.dtMinHD, 0.01);
  EXPECT_EQ(sm.bedResistanceDiscretization, 1);
  EXPECT_EQ(sm.cflCorrectionHD, 0);
  EXPECT_EQ(hd.formulation, 1);

  // Second order in space and flood-and-dry type 1 move the dependent defaults.
  ResetMeshTables();
  SkfCloseFile();
  LogClose();
  hd = Run("FLOOD_AND_DRY { type = 1 }\nSOLUTION_TECHNIQUE {\n"
           "scheme_of_space_discretization_horizontal = 2\n}\nEQUATION { formulation = 4 }");
  EXPECT_EQ(hd.formulation, 1);
  EXPECT_EQ(hd.solution.faceValueLimiter, 2);
  EXPECT_EQ(hd.solution.preserveDU, -1);
  EXPECT_EQ(hd.solution.faceAverageD, 1);
  EXPECT_EQ(hd.solution.bedResistanceDiscretization, 2);
  EXPECT_EQ(hd.solution.cflCorrectionHD, 1);
  EXPECT_EQ(hd.solution.dtMinHD, 0.01);
  LogClose();
  const std::string log = Log();
  for (const char* line : {"face_value_limiter : 2 (default)", "type_of_Riemann_solver : 1 (default)",
                           "CFL_critical_HD : 1 (default)", "dt_max_HD : 60 (default)",
                           "CFL_correction_HD : 1 (default)"})
    EXPECT_NE(log.find(line), std::string::npos) << line << "\n" << log;
}

TEST_F(HDSetup, InitialStateClassifiesDryAndFloodedElements) {
  // Element 1: bed -(2 - 0.3 - 2)/3 ... mean node levels -1.433 (wet at eta 0); element 2:
  // mean (-0.3 + 0.5 - 2)/3 = -0.6, so eta = -0.55 leaves 0.05 m: flooded; eta = -0.7 dry.
  HDModule hd = Run("FLOOD_AND_DRY { type = 1 }\nINITIAL_CONDITIONS { type = 1\n"
                    "surface_elevation_constant = -0.55\n u_velocity_constant = 0.5 }");
  ASSERT_EQ(hd.numElements, 2);
  EXPECT_EQ(hd.wet[1], kWet);
  EXPECT_EQ(hd.wet[2], kFlooded);
  EXPECT_NEAR(hd.h[2], 0.05, 1e-12);
  EXPECT_EQ(hd.u[2], 0.0);
  EXPECT_EQ(hd.p[2], 0.0);
  EXPECT_NEAR(hd.p[1], 0.5 * hd.h[1], 1e-12);
  EXPECT_NEAR(hd.blowUpElevation, 1000.0 + hd.d[1], 1e-12);
  hd.p[1] = 0.3;
  CalcVelocityFromFlux(hd);
  EXPECT_NEAR(hd.u[1], 0.3 / hd.h[1], 1e-15);
  EXPECT_EQ(hd.u[2], 0.0);
}

TEST_F(HDSetup, BedAboveTheDatumStartsDry) {
  HDModule hd = Run("FLOOD_AND_DRY { type = 1 }\nINITIAL_CONDITIONS { type = 1\n"
                    "surface_elevation_constant = -0.7 }");
  EXPECT_EQ(hd.wet[2], kDry);
  EXPECT_EQ(hd.h[2], 0.0);
  EXPECT_EQ(hd.p[2], 0.0);
}

TEST_F(HDSetup, RefusedChoices) {
  EXPECT_EXIT(Run("EQUATION { formulation = 2 }"), ::testing::ExitedWithCode(1),
              "non-hydrostatic");
  EXPECT_EXIT(Run("EQUATION { formulation = 3 }", true), ::testing::ExitedWithCode(1),
              "The non-hydrostaic formulation is not available using GPU");
  EXPECT_EXIT(Run("SOLUTION_TECHNIQUE { type_of_Riemann_solver = 2 }", true),
              ::testing::ExitedWithCode(1), "This type of Riemann solver is not available");
  EXPECT_EXIT(Run("SOLUTION_TECHNIQUE { gradient_limiter = 3 }", true),
              ::testing::ExitedWithCode(1), "This type of gradient limiter is not available");
  EXPECT_EXIT(Run("INITIAL_CONDITIONS { type = 7 }"), ::testing::ExitedWithCode(1),
              "Type not supported");
  EXPECT_EXIT(Run("DEPTH { type = 5 }"), ::testing::ExitedWithCode(1), "Type not supported");
  EXPECT_EXIT(Run("mode = 1"), ::testing::ExitedWithCode(1), "mode is illegal");
}
