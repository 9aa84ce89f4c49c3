/* Hex dump of a byte buffer to the log. */
#ifndef STBPLAT_DISPLAY_UTILS_H
#define STBPLAT_DISPLAY_UTILS_H

#include "stbplat/export.h"
#include "stbplat/log.h"

#ifdef __cplusplus
extern "C" {
#endif

/* Logs data at level 4 under moduleId, 16 bytes a line:
 *   <indent spaces>"41 00 7F " ... padded to 16 columns, 5 blanks, "A.." ...
 * A null data or a zero length logs "<none>". An indent above 103 is clamped
 * to 103; a moduleId outside the level table logs nothing. */
STBPLAT_EXPORT void DumpBuffer(etLogUtilModuleId moduleId, unsigned char indent,
                               unsigned char const* data, unsigned int length);

#ifdef __cplusplus
}
#endif

#endif
