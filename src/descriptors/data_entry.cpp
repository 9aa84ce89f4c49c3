// DataEntry: construction, copying, creation and comparison of payloads.
#include "stbplat/data_entry.h"

#include <cstring>
#include <new>
#include <vector>

#include "descriptors/data_entry_payload.h"
#include "descriptors/record_io.h"

using namespace stbplat::records;

namespace {

unsigned char* AllocatePayload(unsigned int length, const char* function) {
  unsigned char* p = new (std::nothrow) unsigned char[length];
  if (p == nullptr) {
    STBPLAT_LOG(eLogModuleRecords, eLogLevelAllocation, kLogSource, function,
                "Memory allocation failure\r\n");
  }
  return p;
}

}  // namespace

DataEntry::DataEntry() : length(0), pPayload(nullptr), ownsData(true), source(nullptr) {}

DataEntry::DataEntry(const DataEntry& other) : DataEntry() { *this = other; }

DataEntry::~DataEntry() {
  if (pPayload != nullptr && ownsData) delete[] pPayload;
}

DataEntry& DataEntry::operator=(const DataEntry& other) {
  if (this == &other) return *this;
  length = other.length;
  if (length == 0) {
    pPayload = nullptr;
    return *this;
  }
  std::vector<unsigned char> scratch;
  const unsigned char* bytes = nullptr;
  const bool reachable = PayloadBytes(other, scratch, &bytes);
  pPayload = AllocatePayload(length, "operator=");
  ownsData = true;
  if (pPayload != nullptr) {
    if (reachable)
      std::memcpy(pPayload, bytes, length);
    else
      std::memset(pPayload, 0, length);
  }
  return *this;
}

void DataEntry::CreateData(unsigned int newLength) { CreateData(newLength, nullptr); }

void DataEntry::CreateData(unsigned int newLength, const unsigned char* src) {
  length = newLength;
  if (newLength == 0) {
    pPayload = nullptr;
    return;
  }
  pPayload = AllocatePayload(newLength, "CreateData");
  ownsData = true;
  if (pPayload == nullptr) return;
  if (src != nullptr)
    std::memcpy(pPayload, src, newLength);
  else
    std::memset(pPayload, 0, newLength);
}

unsigned char* DataEntry::GetData() const { return pPayload; }

bool DataEntry::operator==(const DataEntry& other) const {
  if (pPayload == nullptr || other.pPayload == nullptr)
    return pPayload == nullptr && other.pPayload == nullptr;
  if (length != other.length) return false;
  std::vector<unsigned char> mine;
  std::vector<unsigned char> theirs;
  const unsigned char* a = nullptr;
  const unsigned char* b = nullptr;
  if (!PayloadBytes(*this, mine, &a) || !PayloadBytes(other, theirs, &b)) return false;
  return std::memcmp(a, b, length) == 0;
}
