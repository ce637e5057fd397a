#include "MeshFiles.h"

namespace tavrintest {

bool CreateTwoElementMesh(DataFile& df, const std::string& file, const double* x, const double* y) {
  VdsInitHeader(df, kVdsFileKindData, "Mesh", "test", 1);
  VdsSetDataType(df, 2000);
  const std::int32_t block[5] = {5, 2, 2, 0, 0};
  for (int i = 0; i < 5; ++i) VdsSetCustomBlockInt(df, i + 1, block[i]);
  VdsSetProjection(df, "UTM-32", 0, 0);
  VdsSetTimeAxis(df, "2004-01-01 00:00:00", 60);
  VdsDefineItem(df, 1, 100079, "Depth", 2);
  if (VdsCreateFile(df, file) != 0) return false;
  const std::int32_t ids[5] = {1, 2, 3, 4, 5}, eids[2] = {1, 2}, types[2] = {21, 25}, counts[2] = {3, 4};
  const float z[5] = {};
  const std::int32_t nodes[7] = {1, 2, 3, 2, 4, 5, 3};
  df.printSummary = false;
  return VdsWriteStaticInt(df, ids, 5) == 0 && VdsWriteStaticDouble(df, x, 5) == 0 &&
         VdsWriteStaticDouble(df, y, 5) == 0 && VdsWriteStaticFloat(df, z, 5) == 0 &&
         VdsWriteStaticInt(df, ids, 5) == 0 && VdsWriteStaticInt(df, eids, 2) == 0 &&
         VdsWriteStaticInt(df, types, 2) == 0 && VdsWriteStaticInt(df, counts, 2) == 0 &&
         VdsWriteStaticInt(df, nodes, 7) == 0;
}

}  // namespace tavrintest
