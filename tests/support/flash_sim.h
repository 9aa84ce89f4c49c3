// The unit tests' device: the emulated device over memory, with faults
// injected on any call.
#ifndef STBPLAT_TESTS_SUPPORT_FLASH_SIM_H
#define STBPLAT_TESTS_SUPPORT_FLASH_SIM_H

#include "devmodel/flash_sim.h"

namespace stbplat {
namespace test {

using devmodel::FlashSim;
using devmodel::SimCall;
using devmodel::SimKind;

}  // namespace test
}  // namespace stbplat

#endif
