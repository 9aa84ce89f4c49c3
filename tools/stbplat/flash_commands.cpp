// mtd list, and flash read | write | erase | erase-sector. A target is a
// component location (DEVICE.PARTITION.SLOT[+OFFSET], resolved through the
// memory map like the library's streams do), an MTD partition by name
// (--mtd NAME[+OFFSET], NAME as mtd_partition_arg.h takes it), or a
// physical NOR address (0xE0010000). NAND offsets count good blocks only,
// as the flash layer does, unless --raw asks for the kernel's (physical)
// offsets.
#include <CLI/CLI.hpp>

#include <algorithm>
#include <cctype>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <functional>
#include <iostream>
#include <memory>
#include <string>
#include <vector>

#include "actions.h"
#include "bad_blocks.h"
#include "command_file.h"
#include "device_table.h"
#include "emmc_slot.h"
#include "location_arg.h"
#include "mtd_erase.h"
#include "mtd_partition_arg.h"
#include "raw_read.h"
#include "log_sink.h"
#include "marked_bad.h"
#include "output.h"
#include "stbplat/extruder.h"
#include "stbplat/flash_interface.h"
#include "stbplat/intruder.h"
#include "stbplat/memory_map.h"
#include "tool.h"

namespace stbtool {
namespace {

Location LocationOf(const LocationArg& arg) {
  return ToComponentLocation(arg).location;
}

// Transfers move in pieces of this size, a few erase blocks of any of the
// device's media: memory stays bounded whatever the transfer's size, and
// progress can be shown.
constexpr unsigned long kPiece = 1024 * 1024;
// The smallest read used to find how far a failed write got.
constexpr unsigned long kReadBackStep = 2048;
// What an erased eMMC slot holds, as erased flash does.
constexpr unsigned char kErasedByte = 0xFF;
// The memory map's technology of NOR devices.
constexpr char kNorTechnology[] = "SPI_NOR.";

enum class TargetForm { kLocation, kMtd, kNorAddress };

struct Target {
  TargetForm form = TargetForm::kLocation;
  std::string text;
  LocationArg location;
  std::string mtdName;
  unsigned long offset = 0;
  unsigned long address = 0;
  // Bytes from the target to the end of its partition, when known.
  unsigned long room = 0;
  bool roomKnown = false;
  Medium medium = Medium::kOther;
  unsigned long pageSize = 0;  // NAND writes start on a page
  // The MTD partition the target lies in, when it has one of its own.
  MtdPartition partition;
  bool hasPartition = false;
  // A slot on eMMC: read at its place on the whole device, written through
  // its own node when /proc/mtd has one.
  bool emmc = false;
  unsigned long emmcPlace = 0;
  bool emmcNodeKnown = false;
  EmmcSlotNode emmcNode;
};

// What a transfer can reach: NAND transfers skip bad blocks, so a NAND
// partition holds its size less its bad blocks.
unsigned long Capacity(const MtdPartition& p) {
  if (p.medium != Medium::kNand) return p.size;
  unsigned long bad = static_cast<unsigned long>(p.badBlocks.size()) * p.eraseSize;
  return bad < p.size ? p.size - bad : 0;
}

// Sets the room left from offset to the end of partition p.
void SetRoom(Target& t, const MtdPartition& p) {
  t.medium = p.medium;
  t.pageSize = p.pageSize;
  t.partition = p;
  t.hasPartition = true;
  if (t.offset > Capacity(p)) return;
  t.room = Capacity(p) - t.offset;
  t.roomKnown = true;
}

const MtdPartition* FindPartition(const DeviceTable& table, const std::string& name) {
  for (const MtdPartition& p : table.partitions)
    if (p.name == name) return &p;
  return nullptr;
}

Target ParseTarget(const std::string& text, bool mtd, const std::string& command) {
  Target t;
  t.text = text;
  DeviceTable table = LoadDeviceTable(true);
  if (mtd) {
    t.form = TargetForm::kMtd;
    size_t plus = text.find('+');
    t.mtdName = text.substr(0, plus);
    if (plus != std::string::npos) t.offset = ParseNumber(text.substr(plus + 1), command + " --mtd offset");
    const MtdPartition* p = &RequireMtdPartition(table, t.mtdName, command + " --mtd");
    t.mtdName = p->name;
    SetRoom(t, *p);
    if (!t.roomKnown) throw UsageError(command + ": offset " + Hex(t.offset) + " lies past the end of " + t.mtdName);
    return t;
  }
  if (!text.empty() && std::isdigit(static_cast<unsigned char>(text[0]))) {
    t.form = TargetForm::kNorAddress;
    t.address = ParseNumber(text, command + " ADDRESS");
    t.medium = Medium::kNor;
    return t;
  }
  if (!ParseLocationArg(text, command + " TARGET", &t.location))
    throw UsageError(command + ": TARGET '" + text +
                     "': expected DEVICE.PARTITION.SLOT[+OFFSET], --mtd NAME or a NOR address");
  t.offset = t.location.offset;
  RequireKnownSlot(t.location, command);
  ExtendedMemoryMapStructure* map = ExtendedMemoryMapStructure::Instance();
  Location location = ToComponentLocation(t.location).location;
  unsigned long slotSize = 0, slotOffset = 0;
  const bool slotKnown = map->GetSlotSizeAndOffset(&location, &slotSize, &slotOffset);
  if (slotKnown && map->IsEMMCDevice(&location) && !map->IsSlotAFile(&location)) {
    t.emmc = true;
    t.emmcPlace = slotOffset;
    t.emmcNodeKnown = FindEmmcSlotNode(location, &t.emmcNode);
  }
  // A slot with a partition of its own tells its size (less its bad
  // blocks); any other slot (and an eMMC slot, read from the whole device)
  // takes its size from the memory map.
  std::string upper = t.location.device + "." + t.location.partition + "." + t.location.slot;
  std::transform(upper.begin(), upper.end(), upper.begin(), [](unsigned char c) { return std::toupper(c); });
  const MtdPartition* own = FindPartition(table, upper);
  if (own != nullptr && !t.emmc) {
    SetRoom(t, *own);
    return t;
  }
  if (slotKnown && t.offset <= slotSize) {
    t.room = slotSize - t.offset;
    t.roomKnown = true;
  }
  return t;
}

// Bytes a write at the target may hold: an eMMC write changes whole pages
// from its offset, all of which must lie in the slot's node.
unsigned long WriteRoom(const Target& t) {
  return t.emmc ? EmmcWriteRoom(t.emmcNode.size, t.offset) : t.room;
}

bool WriteRoomKnown(const Target& t) { return t.emmc ? t.emmcNodeKnown : t.roomKnown; }

// An eMMC slot is changed only through a node of its own; a slot that is not
// whole write units could not be filled without passing its end.
void RequireEmmcNode(const Target& t, const std::string& command, bool whole) {
  if (!t.emmc) return;
  const std::string name = LocationText(LocationOf(t.location));
  if (!t.emmcNodeKnown)
    throw UsageError(command + ": " + t.text + ": /proc/mtd has no row named " + name +
                     "; an eMMC slot is written through a node of its own (docs/device-root.md); nothing was changed");
  if (whole && EmmcWriteRoom(t.emmcNode.size, 0) != t.emmcNode.size)
    throw UsageError(command + ": " + t.text + ": its node " + t.emmcNode.path + " (" + Hex(t.emmcNode.size) +
                     " bytes) is not whole " + Hex(EmmcWriteUnit()) +
                     "-byte eMMC pages, so it cannot be filled without passing its end; nothing was changed");
}

// The library's eMMC write rounds the length up to whole pages: refuses,
// before any change, a write whose rounded range passes the slot's node.
void CheckEmmcRange(const Target& t, const std::string& command, unsigned long length) {
  if (!t.emmc || length <= WriteRoom(t)) return;
  const unsigned long unit = EmmcWriteUnit();
  const unsigned long span = (length + unit - 1) / unit * unit;
  throw UsageError(command + ": " + t.text + ": eMMC is written in whole " + Hex(unit) + "-byte pages, so " +
                   std::to_string(length) + " bytes at +" + Hex(t.offset) + " change " + Hex(span) +
                   " bytes, up to +" + Hex(t.offset + span) + ", past the end of " + t.emmcNode.path + " (" +
                   Hex(t.emmcNode.size) + " bytes; room for " + std::to_string(WriteRoom(t)) +
                   " bytes there); nothing was changed");
}

void RequireYes(bool yes, const std::string& command, const Target& t) {
  if (!yes) throw UsageError(command + " " + t.text + " changes the device; add --yes to go ahead");
}


// The bytes of a target in order, one piece at a time, through the
// library's own calls: a location through its stream (which follows the
// slot's medium), an MTD partition or a NOR address by offset.
class TargetStream {
 public:
  TargetStream(const Target& t, bool writing) : t_(t), component_(ToComponentLocation(t.location)) {
    if (t.form != TargetForm::kLocation) return;
    // A NOR slot by its address: the NOR stream would not report a failed
    // flash call, the calls by address do.
    ExtendedMemoryMapStructure* map = ExtendedMemoryMapStructure::Instance();
    const MemoryDeviceEntry* device = map->GetDevice(&component_.location);
    if (device != nullptr && std::memcmp(device->technology, kNorTechnology, kMemoryMapNameWidth) == 0 &&
        !map->IsSlotAFile(&component_.location)) {
      if (!map->GetPhysAddressFromLocation(&component_.location, t.offset, &norAddress_, nullptr))
        throw Failure(std::string(writing ? "flash write" : "flash read") + ": cannot open " + t.text);
      byAddress_ = true;
      return;
    }
    // A NAND slot through the calls by location, which report failures;
    // the stream's last partial page would go out through a flush that
    // reports nothing.
    if (map->IsNandDevice(&component_.location) && !map->IsSlotAFile(&component_.location)) {
      nandByLocation_ = true;
      return;
    }
    // An eMMC slot by call too: the stream would write at the slot's place
    // on the device inside the slot's own node, past where the slot starts.
    if (t.emmc) {
      if (writing && !t.emmcNodeKnown) throw Failure("flash write: cannot open " + t.text);
      return;
    }
    if (writing) {
      out_.reset(new Intruder(&component_));
      if (!out_->isInitedOK) throw Failure("flash write: cannot open " + t.text);
    } else {
      in_.reset(new Extruder(&component_, false));
      if (!in_->isInitedOK) throw Failure("flash read: cannot open " + t.text);
    }
  }

  // The target's own position of the next byte, for messages.
  unsigned long Position() const { return (t_.form == TargetForm::kNorAddress ? t_.address : t_.offset) + done_; }

  bool Read(unsigned char* data, unsigned long n) {
    bool ok = false;
    if (in_) {
      unsigned int status = in_->extrude(data, static_cast<unsigned int>(n));
      ok = status == kExtrudeOk || status == kExtrudeExhausted;
    } else if (byAddress_) {
      ok = flash_->ReadFromNORFlashAtAddr(norAddress_ + done_, data, n);
    } else if (nandByLocation_) {
      ok = flash_->NANDRead(data, n, &component_.location, t_.offset + done_);
    } else if (t_.emmc) {
      ok = flash_->EMMCRead(data, n, &component_.location, t_.emmcPlace + t_.offset + done_);
    } else if (t_.form == TargetForm::kNorAddress) {
      ok = flash_->ReadFromNORFlashAtAddr(Position(), data, n);
    } else if (t_.medium == Medium::kNand) {
      ok = flash_->NANDRead(data, n, t_.mtdName.c_str(), Position());
    } else {
      unsigned long base = 0;
      const char* path = flash_->LookupMTDPartition(t_.mtdName.c_str(), &base);
      ok = path != nullptr && flash_->LinuxFlashRead(path, base + Position(), data, n);
    }
    if (ok) done_ += n;
    return ok;
  }

  bool Write(const unsigned char* data, unsigned long n) {
    bool ok = false;
    if (out_) {
      unsigned int status = out_->intrude(data, static_cast<unsigned int>(n));
      ok = status == kIntrudeOk || status == kIntrudeFull;
    } else if (byAddress_) {
      ok = flash_->WriteToNORFlashAtAddr(norAddress_ + done_, data, n);
    } else if (nandByLocation_ || t_.medium == Medium::kNand) {
      ok = WriteNandPages(data, n);
    } else if (t_.emmc) {
      ok = WriteEmmcSlot(t_.emmcNode, t_.offset + done_, data, n, onEndlessRetry);
    } else if (t_.form == TargetForm::kNorAddress) {
      ok = flash_->WriteToNORFlashAtAddr(Position(), data, n);
    } else {
      unsigned long base = 0;
      const char* path = flash_->LookupMTDPartition(t_.mtdName.c_str(), &base);
      ok = path != nullptr && flash_->LinuxFlashWrite(path, base + Position(), data, n);
    }
    if (ok) done_ += n;
    return ok;
  }

  // The message for a write the library keeps trying (eMMC): it ends the
  // process.
  std::function<std::string()> onEndlessRetry = [this]() {
    return "flash write: " + t_.text + ": writing failed at " + Hex(Position()) + " and kept failing";
  };

  // Whether bytes move through the library's calls by offset (not a stream),
  // so that Skip can place a read anywhere.
  bool ReadsByCall() const { return !in_ && !out_; }
  void Skip(unsigned long n) { done_ += n; }

  // The stream's NAND writes keep a last partial page back until told to
  // write it.
  void Flush() {
    if (out_) flash_->NANDFlushWrite();
  }

 private:
  // NAND in whole pages: a last partial page goes out padded with erased
  // bytes, which programming leaves as they are, so the call that writes it
  // reports on it too.
  bool WriteNandPages(const unsigned char* data, unsigned long n) {
    const unsigned long page = flash_->nandPageSize != 0 ? flash_->nandPageSize : 1;
    std::vector<unsigned char> padded;
    if (n % page != 0) {
      padded.assign(data, data + n);
      padded.resize(n + page - n % page, kErasedByte);
      data = padded.data();
      n = padded.size();
    }
    if (nandByLocation_) return flash_->NANDWrite(data, n, &component_.location, t_.offset + done_);
    return flash_->NANDWrite(data, n, t_.mtdName.c_str(), Position());
  }

  const Target& t_;
  ComponentLocation component_;
  FlashInterface* flash_ = FlashInterface::Instance();
  std::unique_ptr<Extruder> in_;
  std::unique_ptr<Intruder> out_;
  bool byAddress_ = false;
  bool nandByLocation_ = false;
  unsigned long norAddress_ = 0;
  unsigned long done_ = 0;
};

// Index of the first byte that differs, or n.
unsigned long FirstDifference(const unsigned char* a, const unsigned char* b, unsigned long n) {
  return static_cast<unsigned long>(std::mismatch(a, a + n, b).first - a);
}

// Reads back `n` bytes at the verifier's position and compares them with
// `expected`; a difference fails the command naming its offset.
void VerifyPiece(TargetStream& back, const unsigned char* expected, unsigned long n, std::vector<unsigned char>& scratch,
                 const Target& t, const std::string& file) {
  unsigned long at = back.Position();
  if (!back.Read(scratch.data(), n))
    throw Failure("flash write --verify: " + t.text + ": reading back failed at " + Hex(at));
  unsigned long i = FirstDifference(expected, scratch.data(), n);
  if (i < n)
    throw Failure("flash write --verify: " + t.text + " differs from " + file + " at offset " + Hex(at + i) +
                  " (wrote " + Hex(expected[i], 2) + ", read " + Hex(scratch[i], 2) + ")");
}

// Streams the input into the target piece by piece; with verify, reads it
// back: a file in a second pass once everything is written, standard input
// (which cannot be read twice) piece by piece as it lands.
// What a failed write leaves: the piece is read back to find the first byte
// that is not what was written, and the message says what the target holds
// now.
Failure WriteFailure(const Target& t, const unsigned char* piece, unsigned long n, unsigned long before,
                     bool erased) {
  unsigned long good = 0;
  try {
    TargetStream back(t, false);
    std::vector<unsigned char> scratch(n);
    if (back.ReadsByCall()) {
      back.Skip(before);
      if (back.Read(scratch.data(), n)) {
        good = FirstDifference(piece, scratch.data(), n);
      } else {
        // The piece's end may no longer read (a NAND write can leave the slot
        // short of good blocks): count what is there a page at a time.
        TargetStream pages(t, false);
        pages.Skip(before);
        const unsigned long step = std::max(t.pageSize, kReadBackStep);
        for (unsigned long k; good < n && pages.Read(scratch.data(), k = std::min(step, n - good));) {
          const unsigned long same = FirstDifference(piece + good, scratch.data(), k);
          good += same;
          if (same < k) break;
        }
      }
    }
  } catch (const Failure&) {
    // Not readable back: the piece's start is all that is known.
  }
  const unsigned long start = (t.form == TargetForm::kNorAddress ? t.address : t.offset) + before + good;
  return Failure("flash write: " + t.text + ": writing failed at " + Hex(start) + "; the first " +
                 Hex(before + good) + " bytes are written, the rest " +
                 (erased ? "of the slot is erased" : "is as it was"));
}

unsigned long WriteFromFile(const Target& t, CommandFile& input, const std::string& name, bool verify,
                            unsigned long total, bool erased) {
  std::vector<unsigned char> piece(kPiece), scratch(verify ? kPiece : 0);
  TargetStream out(t, true);
  std::unique_ptr<TargetStream> back;
  if (verify && input.IsStream()) back.reset(new TargetStream(t, false));
  Progress progress("writing " + t.text, total);
  unsigned long done = 0;
  for (unsigned long got; (got = input.Read(piece.data(), kPiece)) > 0; done += got) {
    if (WriteRoomKnown(t) && done + got > WriteRoom(t))
      throw Failure("flash write: " + name + " does not fit in " + t.text + " (" + std::to_string(WriteRoom(t)) +
                    " bytes left)");
    out.onEndlessRetry = [&]() { return std::string(WriteFailure(t, piece.data(), got, done, erased).what()); };
    if (!out.Write(piece.data(), got)) throw WriteFailure(t, piece.data(), got, done, erased);
    if (back) {
      out.Flush();
      VerifyPiece(*back, piece.data(), got, scratch, t, name);
    }
    progress.Update(done + got);
  }
  out.Flush();
  if (!verify || back) return done;
  input.Rewind();
  TargetStream reader(t, false);
  Progress checking("verifying " + t.text, done);
  for (unsigned long checked = 0; checked < done;) {
    unsigned long n = input.Read(piece.data(), std::min(kPiece, done - checked));
    if (n == 0) throw Failure("flash write --verify: " + name + " changed while it was written");
    VerifyPiece(reader, piece.data(), n, scratch, t, name);
    checked += n;
    checking.Update(checked);
  }
  return done;
}

struct TransferArgs {
  std::string target, file;
  bool mtd = false;
  bool yes = false;
  bool erase = false;
  bool verify = false;
  unsigned long length = 0;
  bool hasLength = false;
  // Physical offsets, bad blocks as --bb says, OOB bytes; a padded last page.
  bool raw = false;
  std::string badBlocks;
  bool oob = false;
  bool pad = false;
};

// Says which bad blocks a NAND transfer passed over: by good-block offset
// every one before its end moved its bytes; from a raw offset, those from
// the block it started in.
void NoteSkippedBadBlocks(const std::string& what, const Target& t, unsigned long length, bool raw,
                          unsigned long rawOffset) {
  if (t.medium != Medium::kNand || !t.hasPartition) return;
  const unsigned long block = t.partition.eraseSize;
  std::vector<unsigned long> passed = PassedBadBlocks(t.partition.badBlocks, block, t.offset, length);
  if (raw) passed.erase(passed.begin(), std::lower_bound(passed.begin(), passed.end(), rawOffset - rawOffset % block));
  if (!passed.empty())
    std::cerr << what << ": " << t.text << ": " << (raw ? "" : "NAND offsets count good blocks only: ") << "skipped "
              << BadBlockText(passed, block) << "\n";
}

// --raw, --bb and --oob read by the kernel's offsets, from a partition.
void RequireRawTarget(const Target& t, const std::string& command) {
  if (!t.hasPartition)
    throw UsageError(command + ": --raw, --bb and --oob read an MTD partition: give --mtd NAME or a slot with a "
                     "partition of its own, not " + t.text);
}

void RunRawReadOf(const Target& t, const TransferArgs& args) {
  RequireRawTarget(t, "flash read");
  RawReadArgs raw;
  raw.label = t.text;
  raw.offset = t.offset;
  raw.length = args.length;
  raw.hasLength = args.hasLength;
  raw.oob = args.oob;
  raw.output = args.file.empty() ? "-" : args.file;
  if (!args.badBlocks.empty() && !ParseBadBlockMethod(args.badBlocks, &raw.method))
    throw UsageError("flash read: --bb " + args.badBlocks + ": expected skipbad, padbad or dumpbad");
  RunRawRead(t.partition, raw);
}

// A piece that does not read (a NAND page failing its ECC check, the kernel's
// EBADMSG) is read again page by page to name the page that fails; the
// start of the piece when the target is not read by pages.
unsigned long FirstUnreadablePage(const Target& t, unsigned long done, unsigned long n) {
  const unsigned long start = (t.form == TargetForm::kNorAddress ? t.address : t.offset) + done;
  if (t.medium != Medium::kNand || t.pageSize == 0) return start;
  TargetStream probe(t, false);
  if (!probe.ReadsByCall()) return start;
  probe.Skip(done);
  std::vector<unsigned char> page(t.pageSize);
  QuietLog quiet(eLogModuleFlashAccess);  // the library said it once already
  for (unsigned long at = 0; at < n; at += t.pageSize) {
    const unsigned long position = probe.Position();
    if (!probe.Read(page.data(), std::min(t.pageSize, n - at))) return position;
  }
  return start;
}

void RunRead(const TransferArgs& args) {
  Target t = ParseTarget(args.target, args.mtd, "flash read");
  if (args.raw || args.oob || !args.badBlocks.empty()) return RunRawReadOf(t, args);
  unsigned long length = args.length;
  if (args.hasLength) {
    if (t.roomKnown && length > t.room)
      throw UsageError("flash read: --length " + Hex(length) + " runs past the end of " + t.text + " (" +
                       std::to_string(t.room) + " bytes left)");
  } else if (t.roomKnown) {
    length = t.room;
  } else {
    throw UsageError("flash read: give --length for " + t.text + " (its size is not known)");
  }
  std::string output = args.file.empty() ? "-" : args.file;
  if (output == "-" && isatty(STDOUT_FILENO))
    throw UsageError("flash read: give -o FILE (standard output is a terminal)");
  // The target first: a target that does not open leaves the output file as it was.
  TargetStream in(t, false);
  CommandFile sink(output, true);
  std::vector<unsigned char> piece(std::min(kPiece, length));
  Progress progress("reading " + t.text, length);
  for (unsigned long done = 0; done < length;) {
    unsigned long n = std::min(kPiece, length - done);
    if (!in.Read(piece.data(), n))
      throw Failure("flash read: " + t.text + ": reading failed at " + Hex(FirstUnreadablePage(t, done, n)));
    sink.Write(piece.data(), n);
    done += n;
    progress.Update(done);
  }
  sink.Close();
  NoteSkippedBadBlocks("flash read", t, length, false, 0);
}

// eMMC has no erase: the slot is filled with the erased value through its
// own node (the library's pattern fill would add the slot's place on the
// device to an offset inside that node).
bool EraseLocation(const Target& t, const Location& location, const std::string& command) {
  if (t.emmc) return FillEmmcSlot(t.emmcNode, command, "erasing " + t.text);
  return FlashInterface::Instance()->EraseSlot(&location);
}

// The library's slot erase can report success for a chip that took nothing
// (a NOR erase reports no failure): read the slot back. Slots of unknown
// size are left as the library reported them.
void CheckSlotErased(const Target& t, const std::string& command) {
  if (!t.roomKnown || t.form == TargetForm::kNorAddress) return;
  Target whole = t;
  whole.offset = 0;
  whole.location.offset = 0;
  TargetStream back(whole, false);
  std::vector<unsigned char> piece(std::min(kPiece, t.room + t.offset));
  const unsigned long size = t.room + t.offset;
  for (unsigned long done = 0; done < size;) {
    const unsigned long n = std::min(kPiece, size - done);
    if (!back.Read(piece.data(), n))
      throw Failure(command + ": reading " + t.text + " back failed at " + Hex(done) + "; it may not be erased");
    const auto left = std::find_if(piece.begin(), piece.begin() + static_cast<long>(n),
                                   [](unsigned char b) { return b != kErasedByte; });
    if (left != piece.begin() + static_cast<long>(n))
      throw Failure(command + ": " + t.text + " is not erased at " +
                    Hex(done + static_cast<unsigned long>(left - piece.begin())) + " after the erase");
    done += n;
  }
}

void EraseSlotOf(const Target& t, const std::string& command) {
  Location location;
  if (t.form == TargetForm::kLocation) {
    location = LocationOf(t.location);
  } else {
    LocationArg arg;
    if (!ParseLocationArg(t.mtdName, command, &arg))
      throw UsageError(command + ": " + t.mtdName + " is not a slot; erase a slot by its location");
    location = LocationOf(arg);
  }
  if (!EraseLocation(t, location, command)) throw Failure(command + ": erasing " + t.text + " failed");
  CheckSlotErased(t, command);
}

// --raw: the target's offset is the kernel's; the write starts there (at
// the next good block when it starts a bad one) and, as every NAND write
// here, passes over the bad blocks it meets.
void ToGoodBlockOffset(Target& t) {
  RequireRawTarget(t, "flash write");
  if (t.medium != Medium::kNand) return;
  const MtdPartition& p = t.partition;
  unsigned long logical = 0;
  if (!LogicalOffset(p.badBlocks, p.eraseSize, t.offset, &logical))
    throw UsageError("flash write: " + t.text + ": " + Hex(t.offset) + " lies inside bad block " +
                     std::to_string(t.offset / p.eraseSize));
  t.offset = logical;
  t.location.offset = logical;
  t.roomKnown = false;
  SetRoom(t, p);
}

void RunWrite(const TransferArgs& args) {
  Target t = ParseTarget(args.target, args.mtd, "flash write");
  const unsigned long rawOffset = t.offset;
  if (args.raw) ToGoodBlockOffset(t);
  if (t.medium == Medium::kNand && t.pageSize != 0 && t.offset % t.pageSize != 0)
    throw UsageError("flash write: " + t.text + ": NAND is written from the start of a page (" +
                     Hex(t.pageSize) + " bytes); the page holding the offset starts at +" +
                     Hex(t.offset - t.offset % t.pageSize));
  RequireEmmcNode(t, "flash write", args.erase);
  CommandFile input(args.file, false);
  // Before an erase the whole input must be known to fit: standard input is
  // taken into a temporary file first, no further than the room it has.
  // So is a raw write's, to know that it is whole pages.
  const bool spooled = (args.erase || (args.raw && !args.pad)) && input.IsStream() && WriteRoomKnown(t);
  if (spooled) input.Spool(WriteRoom(t) + 1);
  unsigned long size = 0;
  bool sized = input.Size(&size);
  if (spooled && size > WriteRoom(t))
    throw UsageError("flash write: standard input holds more than the " + std::to_string(WriteRoom(t)) +
                     " bytes " + t.text + " has; nothing was changed");
  if (sized) CheckEmmcRange(t, "flash write", size);
  if (sized && t.roomKnown && size > t.room)
    throw UsageError("flash write: " + args.file + " (" + std::to_string(size) + " bytes) does not fit in " +
                     t.text + " (" + std::to_string(t.room) + " bytes left)");
  // A raw NAND write is whole pages unless told to pad, as nandwrite is.
  if (args.raw && !args.pad && t.medium == Medium::kNand && t.pageSize != 0 && (sized || spooled) &&
      size % t.pageSize != 0)
    throw UsageError("flash write --raw: " + args.file + " (" + std::to_string(size) + " bytes) is not whole " +
                     Hex(t.pageSize) + "-byte pages; pass --pad to fill the last page with 0xFF");
  RequireYes(args.yes, "flash write", t);
  if (args.erase && t.form == TargetForm::kNorAddress)
    throw UsageError("flash write --erase: erase by address with flash erase");
  const MarkedBadWatch marks(t.medium == Medium::kNand && t.hasPartition ? t.partition.name : std::string());
  unsigned long written = 0;
  try {
    if (args.erase) EraseSlotOf(t, "flash write --erase");
    written = WriteFromFile(t, input, args.file, args.verify, sized ? size : 0, args.erase);
  } catch (const Failure& failure) {
    throw Failure(failure.what() + marks.Note(false));
  }
  if (Options().json) {
    Json marked = Json::array();
    for (unsigned long block : marks.Marked()) marked.push_back(block);
    PrintJson({{"target", t.text}, {"written", written}, {"verified", args.verify}, {"erasedFirst", args.erase},
               {"markedBad", marked}});
  } else {
    std::cerr << "wrote " << written << " bytes to " << t.text << (args.verify ? ", verified" : "") << marks.Note(true)
              << "\n";
  }
  NoteSkippedBadBlocks("flash write", t, written, args.raw, rawOffset);
}

struct EraseArgs {
  std::string target;
  bool mtd = false;
  bool yes = false;
  unsigned long length = 0;
  bool hasLength = false;
};

// An erase by NOR address covers whole sectors of one partition; the
// library would round a part sector up, and erase nothing (yet report it
// erased) for a range that leaves its partition.
void CheckNorEraseRange(const std::string& command, unsigned long address, unsigned long length) {
  FlashInterface* flash = FlashInterface::Instance();
  const unsigned long sector = flash->GetNORSectorSize();
  unsigned long offset = 0;
  const char* path = flash->LookupMTDPartition(address, &offset);
  if (path == nullptr) throw UsageError(command + ": " + Hex(address) + " lies in no NOR partition");
  if (sector == 0 || address % sector != 0 || length % sector != 0 || length == 0)
    throw UsageError(command + ": " + Hex(address) + " +" + Hex(length) + " is not whole " + Hex(sector) +
                     "-byte sectors (the sector holding it starts at " + Hex(address - address % sector) + ")");
  const unsigned long size = flash->GetDevSize(path);
  if (offset + length > size)
    throw UsageError(command + ": " + Hex(address) + " +" + Hex(length) + " runs past the end of its partition " +
                     "(" + Hex(size - offset) + " bytes left)");
}

// The NOR erase reports no failure of its own: read the range back.
void CheckErased(const std::string& command, unsigned long address, unsigned long length) {
  FlashInterface* flash = FlashInterface::Instance();
  std::vector<unsigned char> piece(std::min(kPiece, length));
  for (unsigned long done = 0; done < length;) {
    const unsigned long n = std::min(kPiece, length - done);
    if (!flash->ReadFromNORFlashAtAddr(address + done, piece.data(), n))
      throw Failure(command + ": reading back " + Hex(address + done) + " failed; the range may not be erased");
    const auto left = std::find_if(piece.begin(), piece.begin() + static_cast<long>(n),
                                   [](unsigned char b) { return b != kErasedByte; });
    if (left != piece.begin() + static_cast<long>(n))
      throw Failure(command + ": " + Hex(address + done + static_cast<unsigned long>(left - piece.begin())) +
                    " is not erased after the erase");
    done += n;
  }
}

// flash erase --mtd NAME[+OFFSET]: erase blocks by the kernel's offsets.
void RunEraseByMtd(const EraseArgs& args) {
  const DeviceTable table = LoadDeviceTable(false);
  const size_t plus = args.target.find('+');
  RangeEraseArgs range;
  range.label = args.target;
  if (plus != std::string::npos) range.offset = ParseNumber(args.target.substr(plus + 1), "flash erase --mtd offset");
  range.length = args.length;
  range.hasLength = args.hasLength;
  range.yes = args.yes;
  RunMtdErase(RequireMtdPartition(table, args.target.substr(0, plus), "flash erase --mtd"), range);
}

void RunErase(const EraseArgs& args, bool sectorOnly) {
  const std::string command = sectorOnly ? "flash erase-sector" : "flash erase";
  if (args.mtd && !sectorOnly) return RunEraseByMtd(args);
  Target t = ParseTarget(args.target, false, command);
  FlashInterface* flash = FlashInterface::Instance();
  if (t.form == TargetForm::kNorAddress) {
    if (!sectorOnly && !args.hasLength) throw UsageError(command + ": give --length to erase by address");
    CheckNorEraseRange(command, t.address, sectorOnly ? flash->GetNORSectorSize() : args.length);
  } else if (sectorOnly) {
    if (t.emmc)
      throw UsageError(command + ": " + t.text + " is on eMMC, which has no erase sectors; use flash erase");
  } else {
    RequireEmmcNode(t, command, true);
  }
  RequireYes(args.yes, command, t);
  bool ok = false;
  if (t.form == TargetForm::kNorAddress) {
    const unsigned long length = sectorOnly ? flash->GetNORSectorSize() : args.length;
    ok = sectorOnly ? flash->EraseNORSector(t.address) : flash->NORErase(t.address, length);
    if (ok) CheckErased(command, t.address, length);
  } else {
    if (t.location.hasOffset) throw UsageError(command + ": " + t.text + ": slots are erased whole, without an offset");
    Location location = LocationOf(t.location);
    ok = sectorOnly ? flash->EraseSector(&location) : EraseLocation(t, location, command);
    if (ok && !sectorOnly) CheckSlotErased(t, command);
  }
  if (!ok) throw Failure(command + ": erasing " + t.text + " failed");
  if (Options().json)
    PrintJson({{"target", t.text}, {"erased", sectorOnly ? "first erase unit" : "whole"}});
  else
    std::cerr << "erased " << t.text << (sectorOnly ? " (first erase unit)" : "") << "\n";
}

void RunMtdList() {
  DeviceTable table = LoadDeviceTable(true);
  if (table.partitions.empty()) throw Failure("mtd list: no MTD partitions (is /proc/mtd readable?)");
  if (Options().json) {
    Json list = Json::array();
    for (const MtdPartition& p : table.partitions) {
      Json bad = Json::array();
      for (unsigned long b : p.badBlocks) bad.push_back(b);
      list.push_back({{"mtd", p.number}, {"name", p.name}, {"device", p.path}, {"medium", MediumName(p.medium)},
                      {"size", p.size}, {"eraseSize", p.eraseSize}, {"pageSize", p.pageSize},
                      {"wholeChip", p.wholeChip},
                      {"badBlocks", p.badBlocksKnown ? bad : Json(nullptr)}});
    }
    PrintJson(list);
    return;
  }
  std::printf("%-6s %-20s %-5s %10s %10s %8s %4s\n", "MTD", "NAME", "TYPE", "SIZE", "ERASE", "PAGE", "BAD");
  for (const MtdPartition& p : table.partitions) {
    std::string bad = p.badBlocksKnown ? std::to_string(p.badBlocks.size()) : "-";
    std::printf("mtd%-3d %-20s %-5s %10s %10s %8s %4s%s\n", p.number, p.name.c_str(), MediumName(p.medium),
                HumanSize(p.size).c_str(), p.eraseSize ? HumanSize(p.eraseSize).c_str() : "-",
                p.pageSize ? HumanSize(p.pageSize).c_str() : "-", bad.c_str(), p.wholeChip ? "  (whole chip)" : "");
  }
}

}  // namespace

void RegisterFlashCommands(CLI::App& app) {
  CLI::App* mtd = app.add_subcommand("mtd", "The MTD partition table");
  mtd->require_subcommand(1);
  CLI::App* list = mtd->add_subcommand("list", "Partitions with sizes, erase and page sizes and bad-block counts");
  SetAction(list, []() { RunMtdList(); });
  RegisterMtdInfoCommand(*mtd);

  CLI::App* flash = app.add_subcommand(
      "flash",
      "Read, write and erase flash by location (DEVICE.PARTITION.SLOT[+OFFSET]), MTD name (--mtd) or NOR address");
  flash->require_subcommand(1);
  const std::string targetHelp =
      "DEVICE.PARTITION.SLOT[+OFFSET], a NOR address, or with --mtd an MTD partition[+OFFSET] (NAND0.KERNEL.A, "
      "NAND0, mtd5 or flash1.KERNEL.A). NAND offsets count good blocks only (a bad block is skipped: with block 2 "
      "bad, NAND0+0x40000 is block 3), unless --raw";

  static TransferArgs read;
  CLI::App* readCommand = flash->add_subcommand("read", "Copy bytes from flash to a file");
  readCommand->add_option("TARGET", read.target, targetHelp)->required();
  readCommand->add_option("-o,--output", read.file, "Output file (- for standard output)");
  AddNumberOption(readCommand, "-n,--length", &read.length, "Bytes to read (default: to the end of the partition)",
                  &read.hasLength);
  readCommand->add_flag("--mtd", read.mtd, "TARGET names an MTD partition");
  readCommand->add_flag("--raw", read.raw,
                        "The kernel's offsets (every block counts), as nanddump reads; bad blocks as --bb says");
  readCommand->add_option("--bb", read.badBlocks,
                          "Bad blocks with --raw: skipbad (left out; the default, as nanddump), padbad (0xFF in "
                          "their place) or dumpbad (read as they are); implies --raw")
      ->check(CLI::IsMember({kBadBlockMethodNames[0], kBadBlockMethodNames[1], kBadBlockMethodNames[2]}))
      ->type_name("METHOD");
  readCommand->add_flag("--oob", read.oob,
                        "Each page followed by its OOB bytes (nanddump --oob's layout, which --root reads); "
                        "implies --raw");
  SetAction(readCommand, []() { RunRead(read); });

  static TransferArgs write;
  CLI::App* writeCommand = flash->add_subcommand(
      "write", "Copy a file into flash (flash only clears bits: erase first, or pass --erase)");
  writeCommand->add_option("TARGET", write.target, targetHelp)->required();
  writeCommand->add_option("FILE", write.file, "Input file (- for standard input)")->required();
  writeCommand->add_flag("--mtd", write.mtd, "TARGET names an MTD partition");
  writeCommand->add_flag("--raw", write.raw,
                         "TARGET's offset is the kernel's (every block counts), as nandwrite -s; the input must "
                         "be whole pages unless --pad");
  writeCommand->add_flag("--pad", write.pad,
                         "Fill a last partial page with 0xFF, as nandwrite -p (writes by good-block offset "
                         "always do)");
  writeCommand->add_flag("--erase", write.erase, "Erase the whole slot first");
  writeCommand->add_flag("--verify", write.verify,
                         "Read back what was written and compare (standard input: piece by piece)");
  writeCommand->add_flag("-y,--yes", write.yes, "Confirm: change the device");
  SetAction(writeCommand, []() { RunWrite(write); });

  static EraseArgs erase;
  CLI::App* eraseCommand = flash->add_subcommand(
      "erase", "Erase a whole slot, NOR bytes from an address, or with --mtd blocks of a partition or a whole chip");
  eraseCommand->add_option("TARGET", erase.target,
                           "DEVICE.PARTITION.SLOT, a NOR address, or with --mtd an MTD partition[+OFFSET]")
      ->required();
  eraseCommand->add_flag("--mtd", erase.mtd,
                         "TARGET names an MTD partition; erase whole blocks from its offset (the kernel's: every "
                         "block counts) to the end or --length, skipping and naming bad blocks, as flash_erase");
  AddNumberOption(eraseCommand, "-n,--length", &erase.length,
                  "Bytes to erase from a NOR address (whole sectors) or with --mtd (whole blocks)", &erase.hasLength);
  eraseCommand->add_flag("-y,--yes", erase.yes, "Confirm: change the device");
  SetAction(eraseCommand, []() { RunErase(erase, false); });

  static EraseArgs sector;
  CLI::App* sectorCommand = flash->add_subcommand("erase-sector", "Erase the first erase unit of a slot, or the NOR sector at an address");
  sectorCommand->add_option("TARGET", sector.target, "DEVICE.PARTITION.SLOT or a NOR address")->required();
  sectorCommand->add_flag("-y,--yes", sector.yes, "Confirm: change the device");
  SetAction(sectorCommand, []() { RunErase(sector, true); });
}

}  // namespace stbtool
