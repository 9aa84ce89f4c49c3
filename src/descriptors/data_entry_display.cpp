// DataEntry: showing a payload as text.
#include <cstring>
#include <string>
#include <vector>

#include "descriptors/data_entry_payload.h"
#include "descriptors/record_io.h"
#include "stbplat/data_entry.h"

using namespace stbplat::records;

void DataEntry::DisplayAsText() const {
  std::vector<unsigned char> scratch;
  const unsigned char* bytes = nullptr;
  if (length == 0 || !PayloadBytes(*this, scratch, &bytes)) {
    STBPLAT_LOG(eLogModuleRecords, eLogLevelDisplay, kLogSource, "DisplayAsText", "[none]\r\n");
    return;
  }
  // The text may have no terminator: print up to the first zero or length
  // bytes, the last character separately so nothing past the payload is read.
  const char* text = reinterpret_cast<const char*>(bytes);
  const std::size_t n = strnlen(text, length);
  const char last = n > 0 ? text[n - 1] : '\0';
  const std::string head(text, n > 0 ? n - 1 : 0);
  STBPLAT_LOG(eLogModuleRecords, eLogLevelDisplay, kLogSource, "DisplayAsText", "%s%c\r\n",
              head.c_str(), last != '\0' ? last : ' ');
}
