// tesselhd: the engine's program entry. Usage: tesselhd skf-file [-gpu N d1 .. dN]
#include "driver/RunDriver.h"

int main(int argc, char** argv) { RunTesselHD(argc, argv); }
