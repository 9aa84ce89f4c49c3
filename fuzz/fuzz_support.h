// Shared pieces of the fuzz targets: a log sink that formats every message
// (so a bad format argument is caught) and throws the text away, the streams
// an input is read from, and the round-trip property every target checks.
#ifndef STBPLAT_FUZZ_FUZZ_SUPPORT_H
#define STBPLAT_FUZZ_FUZZ_SUPPORT_H

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <vector>

#include "stbplat/stbplat.h"

namespace stbplat {
namespace fuzz {

// The store buffer's size (and growth step).
constexpr unsigned int kStoreBufferSize = 1u << 16;

// Stores `record` with `store(record, intruder)`; returns false when the
// store fails or does not fit the first buffer. The buffer may grow, so that
// running out shows: the version record does not look at its sequence
// control's status, and a fixed buffer would cut it short unnoticed. A grown
// buffer does not hold the record's bytes either: growth resumes writing at
// the old end of the buffer (kept on purpose), leaving a hole.
template <typename StoreFn>
bool StoreToBytes(StoreFn store, std::vector<unsigned char>* out) {
  Intruder intruder(kStoreBufferSize, kStoreBufferSize);
  intruder.growthStep = kStoreBufferSize;
  if (store(intruder) != 0 || intruder.length != kStoreBufferSize) return false;
  out->assign(intruder.pStart, const_cast<const unsigned char*>(intruder.pCurrent));
  return true;
}

// What reads successfully and can be stored must store, read back and store
// again to the same bytes.
template <typename Record, typename ReadFn, typename StoreFn>
void CheckRoundTrip(const Record& first, ReadFn read, StoreFn store) {
  std::vector<unsigned char> once;
  if (!StoreToBytes([&](Intruder& out) { return store(first, out); }, &once)) return;
  Record second;
  Extruder in(once.data(), static_cast<unsigned int>(once.size()));
  if (read(second, in) != 0) std::abort();
  std::vector<unsigned char> twice;
  if (!StoreToBytes([&](Intruder& out) { return store(second, out); }, &twice)) std::abort();
  if (once != twice) std::abort();
}

// Where users meet records: a memory buffer, a slot file and a NOR slot of
// the emulated device (both 64-bit addressed, positioned through the file
// and the flash calls).
enum class Source { kMemory, kFile, kNor };
constexpr Source kSources[] = {Source::kMemory, Source::kFile, Source::kNor};

// A stream over the input on source; null when the input does not fit it.
std::unique_ptr<Extruder> OpenSource(Source source, const unsigned char* data, size_t size);

// The NOR slot's bytes with the input at its start, erased behind it; null
// when the input does not fit the slot.
const std::vector<unsigned char>* NorSlotBytes(const unsigned char* data, size_t size);
// Errors the byte streams have logged so far: a memory stream logs one when
// it runs out.
unsigned long StreamErrorCount();

// A NOR read past the slot does not fail, so a corrupt count walks on
// through the flash calls for up to 65 535 entries: seconds per input, spent
// on the same few failing reads over and over. The record is read from the slot's bytes in memory
// first; the NOR way is taken when that read stays inside them, where both
// streams see the same bytes.
template <typename Record, typename ReadFn>
bool ReadStaysInNorSlot(const unsigned char* data, size_t size, ReadFn read) {
  const std::vector<unsigned char>* slot = NorSlotBytes(data, size);
  if (slot == nullptr) return false;
  Extruder in(slot->data(), static_cast<unsigned int>(slot->size()));
  Record record;
  const unsigned long errors = StreamErrorCount();
  read(record, in);
  return StreamErrorCount() == errors;
}

// Reads a record from the input on every source; what reads must round-trip.
template <typename Record, typename ReadFn, typename StoreFn>
void FuzzRecord(const unsigned char* data, size_t size, ReadFn read, StoreFn store) {
  for (Source source : kSources) {
    if (source == Source::kNor && !ReadStaysInNorSlot<Record>(data, size, read)) continue;
    std::unique_ptr<Extruder> in = OpenSource(source, data, size);
    if (!in) continue;
    Record record;
    if (read(record, *in) == 0) CheckRoundTrip(record, read, store);
  }
}

}  // namespace fuzz
}  // namespace stbplat

// One fuzz target: reads a Record from the input with READ (an expression of
// `r` and `from`); on success checks the round trip, storing with STORE (an
// expression of `r` and `to`).
#define STBPLAT_FUZZ_RECORD(Record, READ, STORE)                                         \
  extern "C" int LLVMFuzzerTestOneInput(const unsigned char* data, size_t size) {        \
    auto read = [](Record& r, Extruder& from) { return READ; };                          \
    auto store = [](const Record& r, Intruder& to) { return STORE; };                    \
    ::stbplat::fuzz::FuzzRecord<Record>(data, size, read, store);                        \
    return 0;                                                                            \
  }

#endif
