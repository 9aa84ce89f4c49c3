// stbplat-mkexample DIR: writes the bundled example device into DIR.
//
// The device: a 256 KiB NOR (64 KiB sectors), a 1 MiB NAND (2 KiB pages,
// 128 KiB blocks, 64 OOB bytes a page, blocks 2 and 5 bad, kept as an OOB
// dump), a 1 MiB eMMC, the kernel's partition table (proc/mtd, one
// partition per slot plus one per chip) and the platform memory map. The
// records in it are built with the library's own Store. FSBLInfo and
// BuildConfig, and their members DeviceConfigDescriptor and
// BuildEnvironmentDescriptor, only read: their type, size, common header and
// fixed fields are written here field by field, around the StoreTLVAndData
// of the members that can store themselves (see example_records.cpp).
#include <sys/stat.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <fstream>
#include <string>
#include <vector>

#include "example_disk.h"
#include "example_layout.h"
#include "example_records.h"

namespace {

using stbplat::example::Layout;

bool MakeDir(const std::string& path) {
  if (mkdir(path.c_str(), 0755) == 0 || errno == EEXIST) return true;
  std::fprintf(stderr, "stbplat-mkexample: %s: %s\n", path.c_str(), std::strerror(errno));
  return false;
}

bool WriteFile(const std::string& path, const void* data, size_t size) {
  std::ofstream out(path, std::ios::binary | std::ios::trunc);
  out.write(static_cast<const char*>(data), static_cast<std::streamsize>(size));
  if (!out) {
    std::fprintf(stderr, "stbplat-mkexample: cannot write %s\n", path.c_str());
    return false;
  }
  return true;
}

bool WriteText(const std::string& path, const std::string& text) {
  return WriteFile(path, text.data(), text.size());
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 2 || argv[1][0] == '-') {
    std::fprintf(stderr, "usage: stbplat-mkexample DIR\n"
                         "Writes the example device (memory map, proc/mtd, flash and eMMC images) into DIR.\n");
    return 2;
  }
  std::string root = argv[1];
  if (!MakeDir(root) || !MakeDir(root + "/proc") || !MakeDir(root + "/proc/scsi") ||
      !MakeDir(root + "/dev"))
    return 1;

  Layout layout;
  std::string error;
  if (!stbplat::example::FillImages(&layout, &error)) {
    std::fprintf(stderr, "stbplat-mkexample: %s\n", error.c_str());
    return 1;
  }
  bool ok = WriteText(root + "/proc/mtd", layout.ProcMtd()) &&
            WriteText(root + "/memory-map.ini", layout.MemoryMap());
  for (const auto& file : layout.GeometryFiles()) ok = ok && WriteText(root + "/dev/" + file.first, file.second);
  ok = ok && WriteFile(root + "/dev/" + layout.norImageName, layout.nor.data(), layout.nor.size()) &&
       WriteFile(root + "/dev/" + layout.nandImageName, layout.nand.data(), layout.nand.size()) &&
       WriteFile(root + "/dev/mmca", layout.emmc.data(), layout.emmc.size());
  for (const auto& file : stbplat::example::DiskFiles()) ok = ok && WriteText(root + "/" + file.first, file.second);
  return ok ? 0 : 1;
}
