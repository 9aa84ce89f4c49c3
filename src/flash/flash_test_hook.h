// Test-only: forgets the flash singleton so that the next Instance() reads
// the partition table again. Not exported.
#ifndef STBPLAT_SRC_FLASH_FLASH_TEST_HOOK_H
#define STBPLAT_SRC_FLASH_FLASH_TEST_HOOK_H

namespace stbplat {
namespace flash {

void ResetFlashInterfaceForTest();

}  // namespace flash
}  // namespace stbplat

#endif
