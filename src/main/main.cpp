#include "main/Driver.h"
#include "main/StandardStreams.h"

#ifdef VANTLE_SIMULATOR
#include <cstdio>

#include "main/SimulatedHandset.h"
#include "ssc/Results.h"
#endif

int main(int argc, char** argv) {
  openMissingStandardStreams();
#ifdef VANTLE_SIMULATOR
  if (!prepareSimulatedHandset(stderr)) return ssc::kInvalid;
  return runVantle(argc, argv, makeEmbeddedHub);
#else
  return runVantle(argc, argv);
#endif
}
