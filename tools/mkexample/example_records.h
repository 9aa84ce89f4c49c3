// The records of the example device, built with the library.
#ifndef STBPLAT_MKEXAMPLE_EXAMPLE_RECORDS_H
#define STBPLAT_MKEXAMPLE_EXAMPLE_RECORDS_H

#include <string>

#include "example_layout.h"

namespace stbplat {
namespace example {

// Builds every record and places it in its slot.
bool FillImages(Layout* layout, std::string* error);

}  // namespace example
}  // namespace stbplat

#endif
