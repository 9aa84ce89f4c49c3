// The bytes of an emulated chip kept in an image file, as host mode finds
// them in a device root.
//
// A NAND image is either plain data with a list of bad blocks beside it
// (IMAGE.bad: block numbers, one a line), or a dump with the out-of-band
// bytes of every page behind it, as nanddump --oob writes it; a block of such
// a dump is bad when its first page's marker byte (BadMarkerByte) is not
// 0xFF, so a real device's dump reads as it is. NOR and eMMC images are plain
// files. The device rules (bits only cleared, erase blocks, bad blocks
// refusing erases) are DeviceNode's; the image only moves bytes.
#ifndef STBPLAT_DEVMODEL_IMAGE_STORAGE_H
#define STBPLAT_DEVMODEL_IMAGE_STORAGE_H

#include <cstdint>
#include <memory>
#include <string>

#include "sim_storage.h"

namespace stbplat {
namespace devmodel {

enum class Medium { kNor, kNand, kEmmc };

struct Geometry {
  Medium medium = Medium::kNor;
  uint64_t size = 0;       // data bytes
  uint64_t eraseSize = 0;  // erase block (NOR sector)
  uint64_t writeSize = 1;  // page (NAND), 1 otherwise
  uint64_t oobSize = 0;    // OOB bytes per page (MEMGETINFO's oobsize)
  bool oobInImage = false; // the image holds them behind each page
};

// The OOB byte of a block's first page that marks the block bad, where the
// kernel looks: byte 5 on small-page NAND (pages of 512 bytes or less),
// byte 0 on large-page NAND.
uint64_t BadMarkerByte(const Geometry& geometry);

// A number as a device root writes it: decimal, or hexadecimal after 0x; no
// sign, no spaces, below 2^64. A leading 0 is still decimal.
bool ParseNumber(const std::string& text, uint64_t* value);

// Opens path read-write, or read-only when it may not be written: the node
// over it is then write-protected (device_node.h). The geometry has been
// checked by the caller; a file of another size than it gives is refused.
// The bad-block markers or list are read once here: the library asks for
// every block from the start of the device for each block it touches. On
// failure returns null and says why (the list's file and line).
std::unique_ptr<SimStorage> OpenImageStorage(const std::string& path, const Geometry& geometry,
                                             std::string* error);

}  // namespace devmodel
}  // namespace stbplat

#endif
