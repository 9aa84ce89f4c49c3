// Token-ageing part of the platform stand-in. The device's platform library
// runs a thread that ages access tokens; off the device there are no tokens,
// so starting it is a no-op that reports success.
#include "stbplat/platform.h"

extern "C" STBPLAT_EXPORT int StartTokenAgingThread(void) { return 0; }
