/* Symbol visibility. Both libraries are built with hidden visibility; only
 * declarations marked here form the binary interface. */
#ifndef STBPLAT_EXPORT_H
#define STBPLAT_EXPORT_H

#define STBPLAT_EXPORT __attribute__((visibility("default")))

#endif
