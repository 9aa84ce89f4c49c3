/* Entry points the host process calls once at start-up. */
#ifndef STBPLAT_SUBSYSTEM_INIT_H
#define STBPLAT_SUBSYSTEM_INIT_H

#include "stbplat/export.h"

#ifdef __cplusplus
extern "C" {
#endif

/* Asks the platform library to start its token-ageing thread and returns its
 * result (StartTokenAgingThread in stbplat/platform.h). */
STBPLAT_EXPORT int ZanSubSystemInit(void);

/* Hardware-specific start-up hook; logs a trace and returns 0. */
STBPLAT_EXPORT int HWSpecificInit(void);

#ifdef __cplusplus
}
#endif

#endif
