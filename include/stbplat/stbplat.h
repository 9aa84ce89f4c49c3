// Umbrella header: everything public in stbplat.
#ifndef STBPLAT_STBPLAT_H
#define STBPLAT_STBPLAT_H

#include "stbplat/export.h"
#include "stbplat/log.h"
#include "stbplat/platform.h"

// Byte streams and checksums
#include "stbplat/crc.h"
#include "stbplat/extruder.h"
#include "stbplat/intruder.h"

// System descriptor records
#include "stbplat/bseck_reload.h"
#include "stbplat/build_config.h"
#include "stbplat/data_entry.h"
#include "stbplat/descriptor_status.h"
#include "stbplat/front_panel.h"
#include "stbplat/fsbl_info.h"
#include "stbplat/memory_config.h"
#include "stbplat/system_descriptor.h"
#include "stbplat/version_entry.h"

// Locations and package headers
#include "stbplat/code_object_info.h"
#include "stbplat/component_location.h"
#include "stbplat/location.h"

// Disk probing
#include "stbplat/disk.h"

// Utilities
#include "stbplat/display_utils.h"
#include "stbplat/ini_reader.h"
#include "stbplat/string_checks.h"
#include "stbplat/subsystem_init.h"

// Flash access and the platform memory map
#include "stbplat/flash_c.h"
#include "stbplat/flash_interface.h"
#include "stbplat/memory_map.h"

#endif
