// mtd list, and flash read | write | erase | erase-sector. A target is a
// component location (DEVICE.PARTITION.SLOT[+OFFSET], resolved through the
// memory map like the library's streams do), an MTD partition by name
// (--mtd NAME[+OFFSET], as mtd list shows it), or a physical NOR address
// (0xE0010000).
#include <CLI/CLI.hpp>

#include <algorithm>
#include <cctype>
#include <cstdio>
#include <unistd.h>
#include <iostream>
#include <string>
#include <vector>

#include "actions.h"
#include "device_table.h"
#include "location_arg.h"
#include "output.h"
#include "stbplat/extruder.h"
#include "stbplat/flash_interface.h"
#include "stbplat/intruder.h"
#include "tool.h"

namespace stbtool {
namespace {

// Transfers move in pieces of this size, so that progress can be shown.
constexpr unsigned long kPiece = 64 * 1024;

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
    const MtdPartition* p = FindPartition(table, t.mtdName);
    if (p == nullptr)
      throw UsageError(command + ": --mtd " + t.mtdName + ": no such partition (see stbplat mtd list)");
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
  // A slot with a partition of its own tells its size.
  std::string upper = t.location.device + "." + t.location.partition + "." + t.location.slot;
  std::transform(upper.begin(), upper.end(), upper.begin(), [](unsigned char c) { return std::toupper(c); });
  if (const MtdPartition* p = FindPartition(table, upper)) SetRoom(t, *p);
  return t;
}

void RequireYes(bool yes, const std::string& command, const Target& t) {
  if (!yes) throw UsageError(command + " " + t.text + " changes the device; add --yes to go ahead");
}

Location LocationOf(const LocationArg& arg) {
  return ToComponentLocation(arg).location;
}

// Reads `length` bytes of the target.
std::vector<unsigned char> ReadTarget(const Target& t, unsigned long length) {
  std::vector<unsigned char> bytes(length);
  FlashInterface* flash = FlashInterface::Instance();
  Progress progress("reading " + t.text, length);
  if (t.form == TargetForm::kLocation) {
    ComponentLocation component = ToComponentLocation(t.location);
    Extruder in(&component, false);
    if (!in.isInitedOK) throw Failure("flash read: cannot open " + t.text);
    for (unsigned long done = 0; done < length;) {
      unsigned int n = static_cast<unsigned int>(std::min(kPiece, length - done));
      unsigned int status = in.extrude(bytes.data() + done, n);
      if (status != kExtrudeOk && status != kExtrudeExhausted)
        throw Failure("flash read: " + t.text + ": reading failed at offset " + Hex(t.offset + done));
      done += n;
      progress.Update(done);
    }
    return bytes;
  }
  for (unsigned long done = 0; done < length;) {
    unsigned long n = std::min(kPiece, length - done);
    bool ok = false;
    if (t.form == TargetForm::kNorAddress) {
      ok = flash->ReadFromNORFlashAtAddr(t.address + done, bytes.data() + done, n);
    } else if (t.medium == Medium::kNand) {
      ok = flash->NANDRead(bytes.data() + done, n, t.mtdName.c_str(), t.offset + done);
    } else {
      unsigned long base = 0;
      const char* path = flash->LookupMTDPartition(t.mtdName.c_str(), &base);
      ok = path != nullptr && flash->LinuxFlashRead(path, base + t.offset + done, bytes.data() + done, n);
    }
    if (!ok) throw Failure("flash read: " + t.text + ": reading failed at " + Hex((t.form == TargetForm::kNorAddress ? t.address : t.offset) + done));
    done += n;
    progress.Update(done);
  }
  return bytes;
}

void WriteTarget(const Target& t, const std::vector<unsigned char>& bytes) {
  FlashInterface* flash = FlashInterface::Instance();
  Progress progress("writing " + t.text, bytes.size());
  if (t.form == TargetForm::kLocation) {
    ComponentLocation component = ToComponentLocation(t.location);
    Intruder out(&component);
    if (!out.isInitedOK) throw Failure("flash write: cannot open " + t.text);
    for (unsigned long done = 0; done < bytes.size();) {
      unsigned int n = static_cast<unsigned int>(std::min<unsigned long>(kPiece, bytes.size() - done));
      unsigned int status = out.intrude(bytes.data() + done, n);
      if (status != kIntrudeOk && status != kIntrudeFull)
        throw Failure("flash write: " + t.text + ": writing failed at offset " + Hex(t.offset + done));
      done += n;
      progress.Update(done);
    }
    // NAND keeps a partial last page back until told to write it.
    flash->NANDFlushWrite();
    return;
  }
  for (unsigned long done = 0; done < bytes.size();) {
    unsigned long n = std::min<unsigned long>(kPiece, bytes.size() - done);
    bool ok = false;
    if (t.form == TargetForm::kNorAddress) {
      ok = flash->WriteToNORFlashAtAddr(t.address + done, bytes.data() + done, n);
    } else if (t.medium == Medium::kNand) {
      ok = flash->NANDWrite(bytes.data() + done, n, t.mtdName.c_str(), t.offset + done);
    } else {
      unsigned long base = 0;
      const char* path = flash->LookupMTDPartition(t.mtdName.c_str(), &base);
      ok = path != nullptr && flash->LinuxFlashWrite(path, base + t.offset + done, bytes.data() + done, n);
    }
    if (!ok) throw Failure("flash write: " + t.text + ": writing failed at " + Hex((t.form == TargetForm::kNorAddress ? t.address : t.offset) + done));
    done += n;
    progress.Update(done);
  }
  flash->NANDFlushWrite();
}

struct TransferArgs {
  std::string target, file;
  bool mtd = false;
  bool yes = false;
  bool erase = false;
  std::string length;
};

void RunRead(const TransferArgs& args) {
  Target t = ParseTarget(args.target, args.mtd, "flash read");
  unsigned long length = 0;
  if (!args.length.empty()) {
    length = ParseNumber(args.length, "flash read --length");
    if (t.roomKnown && length > t.room)
      throw UsageError("flash read: --length " + args.length + " runs past the end of " + t.text + " (" +
                       std::to_string(t.room) + " bytes left)");
  } else if (t.roomKnown) {
    length = t.room;
  } else {
    throw UsageError("flash read: give --length for " + t.text + " (its size is not known)");
  }
  std::vector<unsigned char> bytes = ReadTarget(t, length);
  std::string output = args.file.empty() ? "-" : args.file;
  if (output == "-" && isatty(1)) throw UsageError("flash read: give -o FILE (standard output is a terminal)");
  WriteWholeFile(output, bytes);
}

void EraseSlotOf(const Target& t, const std::string& command) {
  FlashInterface* flash = FlashInterface::Instance();
  Location location;
  if (t.form == TargetForm::kLocation) {
    location = LocationOf(t.location);
  } else {
    LocationArg arg;
    if (!ParseLocationArg(t.mtdName, command, &arg))
      throw UsageError(command + ": " + t.mtdName + " is not a slot; erase a slot by its location");
    location = LocationOf(arg);
  }
  if (!flash->EraseSlot(&location)) throw Failure(command + ": erasing " + t.text + " failed");
}

void RunWrite(const TransferArgs& args) {
  Target t = ParseTarget(args.target, args.mtd, "flash write");
  std::vector<unsigned char> bytes = ReadWholeFile(args.file);
  if (t.roomKnown && bytes.size() > t.room)
    throw UsageError("flash write: " + args.file + " (" + std::to_string(bytes.size()) + " bytes) does not fit in " +
                     t.text + " (" + std::to_string(t.room) + " bytes left)");
  RequireYes(args.yes, "flash write", t);
  if (args.erase) {
    if (t.form == TargetForm::kNorAddress) throw UsageError("flash write --erase: erase by address with flash erase");
    EraseSlotOf(t, "flash write --erase");
  }
  WriteTarget(t, bytes);
  if (!Options().json) std::cerr << "wrote " << bytes.size() << " bytes to " << t.text << "\n";
}

struct EraseArgs {
  std::string target;
  bool yes = false;
  std::string length;
};

void RunErase(const EraseArgs& args, bool sectorOnly) {
  const std::string command = sectorOnly ? "flash erase-sector" : "flash erase";
  Target t = ParseTarget(args.target, false, command);
  RequireYes(args.yes, command, t);
  FlashInterface* flash = FlashInterface::Instance();
  bool ok = false;
  if (t.form == TargetForm::kNorAddress) {
    if (sectorOnly) {
      ok = flash->EraseNORSector(t.address);
    } else {
      if (args.length.empty()) throw UsageError(command + ": give --length to erase by address");
      ok = flash->NORErase(t.address, ParseNumber(args.length, command + " --length"));
    }
  } else {
    if (t.location.hasOffset) throw UsageError(command + ": " + t.text + ": slots are erased whole, without an offset");
    Location location = LocationOf(t.location);
    ok = sectorOnly ? flash->EraseSector(&location) : flash->EraseSlot(&location);
  }
  if (!ok) throw Failure(command + ": erasing " + t.text + " failed");
  if (!Options().json) std::cerr << "erased " << t.text << (sectorOnly ? " (first erase unit)" : "") << "\n";
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

  CLI::App* flash = app.add_subcommand(
      "flash",
      "Read, write and erase flash by location (DEVICE.PARTITION.SLOT[+OFFSET]), MTD name (--mtd) or NOR address");
  flash->require_subcommand(1);
  const std::string targetHelp = "DEVICE.PARTITION.SLOT[+OFFSET], a NOR address, or with --mtd an MTD name[+OFFSET]";

  static TransferArgs read;
  CLI::App* readCommand = flash->add_subcommand("read", "Copy bytes from flash to a file");
  readCommand->add_option("TARGET", read.target, targetHelp)->required();
  readCommand->add_option("-o,--output", read.file, "Output file (- for standard output)");
  readCommand->add_option("-n,--length", read.length, "Bytes to read (default: to the end of the partition)");
  readCommand->add_flag("--mtd", read.mtd, "TARGET names an MTD partition");
  SetAction(readCommand, []() { RunRead(read); });

  static TransferArgs write;
  CLI::App* writeCommand = flash->add_subcommand(
      "write", "Copy a file into flash (flash only clears bits: erase first, or pass --erase)");
  writeCommand->add_option("TARGET", write.target, targetHelp)->required();
  writeCommand->add_option("FILE", write.file, "Input file (- for standard input)")->required();
  writeCommand->add_flag("--mtd", write.mtd, "TARGET names an MTD partition");
  writeCommand->add_flag("--erase", write.erase, "Erase the whole slot first");
  writeCommand->add_flag("-y,--yes", write.yes, "Confirm: change the device");
  SetAction(writeCommand, []() { RunWrite(write); });

  static EraseArgs erase;
  CLI::App* eraseCommand = flash->add_subcommand("erase", "Erase a whole slot, or NOR bytes from an address");
  eraseCommand->add_option("TARGET", erase.target, "DEVICE.PARTITION.SLOT or a NOR address")->required();
  eraseCommand->add_option("-n,--length", erase.length, "Bytes to erase from a NOR address (whole sectors)");
  eraseCommand->add_flag("-y,--yes", erase.yes, "Confirm: change the device");
  SetAction(eraseCommand, []() { RunErase(erase, false); });

  static EraseArgs sector;
  CLI::App* sectorCommand = flash->add_subcommand("erase-sector", "Erase the first erase unit of a slot, or the NOR sector at an address");
  sectorCommand->add_option("TARGET", sector.target, "DEVICE.PARTITION.SLOT or a NOR address")->required();
  sectorCommand->add_flag("-y,--yes", sector.yes, "Confirm: change the device");
  SetAction(sectorCommand, []() { RunErase(sector, true); });
}

}  // namespace stbtool
