// The bytes of an emulated chip kept in an image file, as host mode finds
// them in a device root.
//
// A NAND image is either plain data with a list of bad blocks beside it
// (IMAGE.bad: block numbers, one a line), or a dump with the out-of-band
// bytes of every page behind it, as nanddump --oob writes it; a block of such
// a dump is bad when the first OOB byte of its first page is not 0xFF, so a
// real device's dump reads as it is. NOR and eMMC images are plain files.
// The device rules (bits only cleared, erase blocks, bad blocks refusing
// erases) are DeviceNode's; the image only moves bytes.
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
  uint64_t oobSize = 0;    // OOB bytes per page when the image holds them
};

// Opens path read-write, or read-only when it may not be written: the node
// over it is then write-protected (device_node.h). The file's size decides whether a NAND image holds
// OOB bytes; any other size is refused. The bad-block markers or list are
// read once here: the library asks for every block from the start of the
// device for each block it touches. On failure returns null and says why.
std::unique_ptr<SimStorage> OpenImageStorage(const std::string& path, const Geometry& geometry,
                                             std::string* error);

}  // namespace devmodel
}  // namespace stbplat

#endif
