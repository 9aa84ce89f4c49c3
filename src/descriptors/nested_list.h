// Reading and writing the lists of nested records a container holds.
#ifndef STBPLAT_SRC_DESCRIPTORS_NESTED_LIST_H
#define STBPLAT_SRC_DESCRIPTORS_NESTED_LIST_H

#include <vector>

#include "stbplat/descriptor_status.h"

namespace stbplat {
namespace records {

// What becomes of the element whose read failed.
enum class FailedElement { kDropped, kKept };

// Empties list, then reads up to count elements with readOne(element),
// appending each. The first failing element ends the read with its status;
// it is dropped again or kept as it was left (earlier ones stay). The list
// grows only by elements actually read, so a corrupt count costs no more
// than the stream holds.
template <typename T, typename ReadOne>
unsigned int ReadList(unsigned long count, std::vector<T>& list, FailedElement failed, ReadOne readOne) {
  list.clear();
  for (unsigned long i = 0; i < count; ++i) {
    list.emplace_back();
    const unsigned int result = readOne(list.back());
    if (result != kDescriptorOk) {
      if (failed == FailedElement::kDropped) list.pop_back();
      return result;
    }
  }
  return kDescriptorOk;
}

// Stores every element with storeOne(element); false at the first failure.
template <typename T, typename StoreOne>
bool StoreList(const std::vector<T>& list, StoreOne storeOne) {
  for (const T& element : list) {
    if (storeOne(element) != kDescriptorOk) return false;
  }
  return true;
}

}  // namespace records
}  // namespace stbplat

#endif
