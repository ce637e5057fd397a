#include <iostream>

#include "io/VdsTool.h"

int main(int argc, char** argv) { return VdsToolMain(argc, argv, std::cout, std::cerr); }
