// Size check of classic NetCDF files (CDF-1, CDF-2 and CDF-5) before anything is read from them.
// The NetCDF library reads past the end of a truncated classic file as zeros; this walks the
// file's header and checks that every variable's data, for every record the header claims, lies
// inside the file. Hostile headers (huge dimensions, counts past the header) fail the same way.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

// True when the file is not a classic NetCDF file (nothing to check) or when it is one and
// complete; false with a reason in *why otherwise.
bool CheckClassicNetCdfSize(const std::string& fileName, std::string* why);

// Where a classic file keeps its data, as its header says.
struct ClassicVariable {
  std::string name;
  bool record = false;       // has the unlimited dimension
  std::uint64_t begin = 0;   // offset of the data (of record 0 for record variables)
  std::uint64_t bytes = 0;   // bytes of the data (of one record for record variables)
};
struct ClassicLayout {
  int version = 0;                   // 1, 2 or 5
  std::uint64_t numrecs = 0;
  int numrecsWidth = 4;              // bytes of the record count at offset 4 (8 in CDF-5)
  std::uint64_t recordSize = 0;      // distance between records
  std::vector<ClassicVariable> variables;
};

// Reads the layout of a classic file and checks it against the file's size (as
// CheckClassicNetCdfSize); false with a reason otherwise, also for files that are not classic.
bool ReadClassicLayout(const std::string& fileName, ClassicLayout& layout, std::string* why);
