// A device for the flash tests: NOR, NAND, eMMC, a file slot and physical
// memory, described by a memory map and a /proc/mtd table in the simulator.
#ifndef STBPLAT_TESTS_FLASH_FLASH_FIXTURE_H
#define STBPLAT_TESTS_FLASH_FLASH_FIXTURE_H

#include <gtest/gtest.h>

#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include "flash/flash_test_hook.h"
#include "stbplat/flash_interface.h"
#include "stbplat/location.h"
#include "stbplat/memory_map.h"
#include "support/flash_sim.h"
#include "support/log_capture.h"
#include "support/scratch_dir.h"

namespace stbplat {
namespace test {

constexpr unsigned long kNorBase = 0xE0000000UL;
constexpr unsigned long kNorSector = 0x10000;
constexpr unsigned long kNandBlock = 0x20000;
constexpr unsigned long kNandPage = 2048;
constexpr unsigned long kNandSize = 0x100000;
constexpr unsigned long kSdramBase = 0x30000000UL;
constexpr const char* kNandData = "/dev/mtd2";
constexpr const char* kEmmcNode = "/dev/mmca";

// The test device's memory map (tests/data/flash-device.ini).
inline std::string DeviceMap() {
  std::ifstream file(STBPLAT_TEST_DATA_DIR "/flash-device.ini");
  return std::string(std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>());
}

inline bool LoadMap(const std::string& text, std::string* error = nullptr) {
  ScratchDir dir;
  std::string ignored;
  return ExtendedMemoryMapStructure::Load(dir.Write("map.ini", text).c_str(), error ? error : &ignored);
}

inline Location MakeLocation(const char* device, const char* partition, const char* slot) {
  return Location(reinterpret_cast<const unsigned char*>(device),
                  reinterpret_cast<const unsigned char*>(partition),
                  reinterpret_cast<const unsigned char*>(slot));
}

// A transfer or erase the simulator saw: offset, length.
using Span = std::pair<uint64_t, uint64_t>;

inline std::vector<uint8_t> Pattern(size_t length, uint8_t seed) {
  std::vector<uint8_t> bytes(length);
  for (size_t i = 0; i < length; ++i) bytes[i] = static_cast<uint8_t>(seed + i * 7 + (i >> 8));
  return bytes;
}

// The simulator with the test device, the memory map loaded, and a fresh
// flash singleton (created by the first Flash()).
class FlashTest : public ::testing::Test {
 protected:
  void SetUp() override {
    flash::ResetFlashInterfaceForTest();
    sim_.AddMtd(0, "flash0.BOOT.FSBL", SimKind::kNor, 0x40000, kNorSector);
    sim_.AddMtd(1, "flash0.BOOT.CONFIG", SimKind::kNor, 0x40000, kNorSector);
    sim_.AddMtd(2, "NAND0.SYS.DATA", SimKind::kNand, kNandSize, kNandBlock, kNandPage);
    sim_.AddMtd(3, "NAND0.SYS.SPARE", SimKind::kNand, kNandSize, kNandBlock, kNandPage);
    sim_.AddEmmc(kEmmcNode, 0x1000000);
    sim_.AddMtd(4, "EMMC0.APP.STORE", SimKind::kNor, 0, kNorSector);
    sim_.Alias("/dev/mtd4", kEmmcNode);
    sim_.AddMtd(8, "flash0", SimKind::kNor, 0x400000, kNorSector);
    sim_.AddMtd(9, "flash1", SimKind::kNand, 0x200000, kNandBlock, kNandPage);
    sim_.AddMemory(kSdramBase, 0x100000);
    ASSERT_TRUE(LoadMap(DeviceMap()));
  }
  void TearDown() override {
    EXPECT_EQ(sim_.OpenCount(), 0) << "descriptors or streams left open";
    EXPECT_EQ(sim_.MappingCount(), 0) << "physical memory left mapped";
    flash::ResetFlashInterfaceForTest();
    ExtendedMemoryMapStructure::Reset();
  }
  FlashInterface& Flash() { return *FlashInterface::Instance(); }

  FlashSim sim_;
};

}  // namespace test
}  // namespace stbplat

#endif
