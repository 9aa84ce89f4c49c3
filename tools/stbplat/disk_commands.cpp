// Hard-disk probing: identity and size of a block device, and the disk's
// current temperature (one reading through smartctl).
#include <CLI/CLI.hpp>

#include <cerrno>
#include <cstring>
#include <iostream>
#include <string>

#include "actions.h"
#include "output.h"
#include "stbplat/disk.h"
#include "tool.h"

namespace stbtool {
namespace {

constexpr unsigned long kSizeUnknown = ~0UL;

// The value behind "label" on a line of the library's identity print-out.
std::string FieldAfter(const std::string& text, const std::string& label) {
  size_t at = text.find(label);
  if (at == std::string::npos) return "";
  at += label.size();
  size_t end = text.find('\n', at);
  std::string value = text.substr(at, end == std::string::npos ? std::string::npos : end - at);
  while (!value.empty() && (value.back() == ' ' || value.back() == '\r')) value.pop_back();
  size_t first = value.find_first_not_of(' ');
  return first == std::string::npos ? "" : value.substr(first);
}

void RunDiskInfo(const std::string& device) {
  if (device.empty() || device.find('/') != std::string::npos)
    throw UsageError("disk info: DEVICE must be a kernel name such as sda, not '" + device + "'");
  int opened = -1;
  int isDisk = 0;
  unsigned long size = kSizeUnknown;
  int openError = 0;
  std::string printed = CaptureStandardOutput([&]() {
    std::string name = device;
    opened = GetVendorInfo(&name[0]);
    openError = errno;
    size = GetBlkDevSize(device.c_str());
    isDisk = IsDevHDD(device.c_str());
  });
  if (opened != 0) throw Failure("disk info: cannot open /dev/" + device + ": " + std::strerror(openError));
  std::string model = FieldAfter(printed, "Hard Disk Model:");
  std::string serial = FieldAfter(printed, "Serial Number:");
  if (Options().json) {
    Json out = {{"device", device}, {"model", model}, {"serial", serial},
                {"hardDisk", isDisk == 1}};
    out["size"] = size == kSizeUnknown ? Json(nullptr) : Json(size);
    PrintJson(out);
    return;
  }
  std::cout << "device     /dev/" << device << "\n"
            << "model      " << (model.empty() ? "(not reported)" : model) << "\n"
            << "serial     " << (serial.empty() ? "(not reported)" : serial) << "\n"
            << "size       " << (size == kSizeUnknown ? "(unknown)" : HumanSize(size) + " (" + std::to_string(size) + " bytes)") << "\n"
            << "hard disk  " << (isDisk == 1 ? "yes" : "no") << "\n";
}

void RunDiskTemp() {
  int temperature = 0;
  bool ok = false;
  CaptureStandardOutput([&]() { ok = GetHdTemperature(&temperature); });
  if (!ok) throw Failure("disk temp: no disk temperature available");
  if (Options().json)
    PrintJson({{"celsius", temperature}});
  else
    std::cout << temperature << " C\n";
}

}  // namespace

void RegisterDiskCommands(CLI::App& app) {
  CLI::App* disk = app.add_subcommand("disk", "Hard-disk identity and temperature");
  disk->require_subcommand(1);

  static std::string device = "sda";
  CLI::App* info = disk->add_subcommand("info", "Model, serial number and size of a block device");
  info->add_option("DEVICE", device, "Kernel device name")->capture_default_str();
  SetAction(info, []() { RunDiskInfo(device); });

  CLI::App* temp = disk->add_subcommand("temp", "Current temperature of the hard disk");
  SetAction(temp, []() { RunDiskTemp(); });
}

}  // namespace stbtool
