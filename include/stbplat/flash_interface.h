// FlashInterface: the process-wide object through which the library touches
// raw flash. It maps partition names, Locations and physical NOR addresses
// onto Linux MTD nodes (/dev/mtdN) and eMMC, and reads, writes and erases
// NOR, NAND (skipping and relocating bad blocks) and eMMC storage.
//
// Created on the first Instance() and never destroyed. Nothing is locked:
// callers serialise flash access (the NAND partial-page state is shared).
//
// Made safe on bad input:
// - the eMMC chunk loop retries a failing write without limit, as required;
//   it never returns while the device keeps refusing (tests inject failures
//   that clear);
// - a measured erase or page size of 0 is not taken over (the default stays),
//   and NAND operations refuse to run with a NAND block size of 0 (no NAND
//   device) or without a page buffer, instead of looping or dividing by 0;
//   erasing a NAND slot or sector then fails with a message, since nothing
//   was erased;
// - the partial-page buffer belongs to one device and one page: a NANDWrite
//   to another device, or of whole pages elsewhere, writes it out first; a
//   write inside another page is refused; never more than nandPageSize bytes
//   come from it;
// - an eMMC chunk rounded up past the end of the caller's data is completed
//   with the bytes the device already holds there, not with bytes read past
//   the caller's buffer;
// - a /proc/mtd line that does not parse, or with a negative number, is
//   skipped.
// Only the platform library's listed functions are imported: a file slot's
// path comes from GetMTDorFileName, and the NAND device's base address for
// the old-kernel fallback from the record GetDevice returns (physBase).
#ifndef STBPLAT_FLASH_INTERFACE_H
#define STBPLAT_FLASH_INTERFACE_H

#include "stbplat/export.h"

class Location;

// Set while an upgrade rewrites whole devices: lookups then resolve slots to
// the partition spanning the whole device, and NOR addresses to the fixed
// mapping.
extern STBPLAT_EXPORT bool isRDLQUpgradeInProgress;

class STBPLAT_EXPORT FlashInterface {
 public:
  static constexpr int kMaxMtdDevices = 30;
  static constexpr int kMtdNameLength = 100;
  static constexpr int kMaxAliases = 30;

  char mtdNames[kMaxMtdDevices][kMtdNameLength];
  // Searched by prefix after mtdNames; never filled (aliasCount stays 0).
  char aliasNames[kMaxAliases][kMtdNameLength];
  unsigned long mtdSizes[kMaxMtdDevices];
  unsigned char mtdCount;
  unsigned char aliasCount;
  unsigned long norSectorSize;
  unsigned long emmcChunkSize;
  unsigned long spareSectorSize;  // kept for layout; no operation reads it
  unsigned long nandSectorSize;
  unsigned long nandPageSize;
  unsigned long pendingNANDOffset;
  unsigned long blocksMarkedBad;
  unsigned long badBlocksSkipped;
  unsigned char* nandPageBuffer;
  unsigned long currNANDBufferOffset;
  const char* pendingNANDDevice;

  static FlashInterface* m_pSelf;

  static FlashInterface* Instance();

  // Partition table lookups. Each returns a path from a static table (never
  // to be freed), or null.
  const char* LookupMTDPartition(const char* name, unsigned long* offset);
  const char* LookupMTDPartition(const Location* location, unsigned long* offset);
  const char* LookupMTDPartition(unsigned long physAddress, unsigned long* offset);
  unsigned long GetNORChipSize();
  unsigned long GetNORSectorSize();

  // One transfer each; the node is opened and closed by every call.
  bool LinuxFlashRead(const char* path, unsigned long offset, unsigned char* buffer,
                      unsigned long length);
  bool LinuxFlashWrite(const char* path, unsigned long offset, const unsigned char* buffer,
                       unsigned long length);
  bool LinuxEMMCRead(const char* path, unsigned long offset, unsigned char* buffer,
                     unsigned long length);
  bool LinuxEMMCWrite(const char* path, unsigned long offset, const unsigned char* buffer,
                      unsigned long length);
  unsigned long GetDevSize(const char* path);
  bool ValidBlockOffset(const char* path, unsigned long offset, unsigned long& physical);

  // NOR, by physical address.
  bool WriteToNORFlashAtAddr(unsigned long address, const unsigned char* buffer,
                             unsigned long length);
  bool ReadFromNORFlashAtAddr(unsigned long address, unsigned char* buffer, unsigned long length);
  bool EraseNORSector(unsigned long address);
  bool NORErase(unsigned long address, unsigned long numBytes);

  // NAND, by logical offset over good blocks.
  bool NANDRead(unsigned char* buffer, unsigned long length, const char* name,
                unsigned long offset);
  bool NANDRead(unsigned char* buffer, unsigned long length, const Location* location,
                unsigned long offset);
  bool NANDWrite(const unsigned char* buffer, unsigned long length, const char* name,
                 unsigned long offset);
  bool NANDWrite(const unsigned char* buffer, unsigned long length, const Location* location,
                 unsigned long offset);
  void NANDFlushWrite();
  bool HandleBadNANDBlock(const char* path, unsigned long failedOffset);
  const char* FindOldKernelNANDmtdNameAndAdjustOffset(const char* name, unsigned long& offset);

  // eMMC.
  bool EMMCRead(unsigned char* buffer, unsigned long length, const char* name,
                unsigned long offset);
  bool EMMCRead(unsigned char* buffer, unsigned long length, const Location* location,
                unsigned long offset);
  bool EMMCWrite(const unsigned char* buffer, unsigned long length, const char* name,
                 unsigned long offset);
  bool EMMCWrite(const unsigned char* buffer, unsigned long length, const Location* location,
                 unsigned long offset);
  bool EMMCErase(const Location* location, unsigned long offset, unsigned long length,
                 unsigned char fill);

  // Erasing by Location, and whole NAND partitions by path.
  bool EraseSlot(const Location* location);
  bool EraseSector(const Location* location);
  bool EraseNANDSlot(const char* path);
  bool EraseNANDSector(const char* path);

 private:
  FlashInterface();
};

#endif
