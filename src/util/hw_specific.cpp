#include "stbplat/subsystem_init.h"

#include "util/log_gate.h"

extern "C" int HWSpecificInit(void) {
  STBPLAT_LOG(eLogModuleHWSpecific, eLogLevelTrace, "HWSpecific", "HWSpecificInit",
              "HW Specific Init\n");
  return 0;
}
