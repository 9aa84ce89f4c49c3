// C entry points: each forwards to the singleton's member unchanged.
#include "stbplat/flash_c.h"

#include "stbplat/flash_interface.h"

extern "C" {

bool WriteToNORFlashAtAddr(unsigned long address, const unsigned char* buffer,
                           unsigned long length) {
  return FlashInterface::Instance()->WriteToNORFlashAtAddr(address, buffer, length);
}

bool ReadFromNORFlashAtAddr(unsigned long address, unsigned char* buffer, unsigned long length) {
  return FlashInterface::Instance()->ReadFromNORFlashAtAddr(address, buffer, length);
}

bool EraseNOR(unsigned long address, unsigned long numBytes) {
  return FlashInterface::Instance()->NORErase(address, numBytes);
}

const char* LookupMTDPartition(const char* name, unsigned long* offset) {
  return FlashInterface::Instance()->LookupMTDPartition(name, offset);
}

const char* LookupMTDPartitionLoc(const Location* location, unsigned long* offset) {
  return FlashInterface::Instance()->LookupMTDPartition(location, offset);
}

bool NANDRead(unsigned char* buffer, unsigned long length, const char* name,
              unsigned long offset) {
  return FlashInterface::Instance()->NANDRead(buffer, length, name, offset);
}

bool NANDReadLoc(unsigned char* buffer, unsigned long length, const Location* location,
                 unsigned long offset) {
  return FlashInterface::Instance()->NANDRead(buffer, length, location, offset);
}

bool NANDWrite(const unsigned char* buffer, unsigned long length, const char* name,
               unsigned long offset) {
  return FlashInterface::Instance()->NANDWrite(buffer, length, name, offset);
}

bool NANDWriteLoc(const unsigned char* buffer, unsigned long length, const Location* location,
                  unsigned long offset) {
  return FlashInterface::Instance()->NANDWrite(buffer, length, location, offset);
}

unsigned long GetNORSectorSize(void) { return FlashInterface::Instance()->GetNORSectorSize(); }

}  // extern "C"
