// vdstool: inspect, dump and make data files from the command line.
//
//   vdstool info FILE                    header, axes, items and their value ranges
//   vdstool dump FILE [options]          items as CSV on standard output (alias: to-csv)
//   vdstool from-csv IN.csv OUT.vds0 ... point series from a CSV table
//   vdstool units [--units|--kinds]      the item-type and unit tables as CSV
//
// All of the tool lives behind one entry so the tests can run it in-process; the program's
// main only forwards to it. Output goes to `out`, messages to `err` (each starting with
// "vdstool: "). The result is the process exit code: 0 on success, 1 on any error.
#pragma once

#include <ostream>

int VdsToolMain(int argc, char** argv, std::ostream& out, std::ostream& err);
