#include "flash/flash_test_hook.h"

#include "stbplat/flash_interface.h"

namespace stbplat {
namespace flash {

void ResetFlashInterfaceForTest() {
  FlashInterface* self = FlashInterface::m_pSelf;
  if (self == nullptr) return;
  delete[] self->nandPageBuffer;
  delete self;
  FlashInterface::m_pSelf = nullptr;
  isRDLQUpgradeInProgress = false;
}

}  // namespace flash
}  // namespace stbplat
