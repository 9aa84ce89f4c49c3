#include "stbplat/subsystem_init.h"

#include "stbplat/platform.h"

// The token-ageing thread and its parameters belong to the platform library;
// this library only offers the entry point under its own name.
extern "C" int ZanSubSystemInit(void) { return StartTokenAgingThread(); }
