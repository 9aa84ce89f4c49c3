#include "disk_sim.h"

#include <fcntl.h>
#include <linux/fs.h>
#include <linux/hdreg.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <cstring>

namespace stbplat {
namespace devmodel {
namespace {

DiskSim* g_current = nullptr;

const os::SysCalls& Libc() { return os::LibcSysCalls(); }

// The drive's identity block: the serial number is 20 characters at byte 20,
// the model 40 at byte 54, both padded with spaces.
constexpr size_t kIdentitySize = 512;
constexpr size_t kSerialOffset = 20, kSerialLength = 20;
constexpr size_t kModelOffset = 54, kModelLength = 40;
// HDIO_DRIVE_CMD: four command bytes, then the sector whose attribute table
// starts at byte 2.
constexpr size_t kDriveCmdArgs = 4;
constexpr size_t kAttributeTableOffset = 2;
// The kernel's SCSI_IOCTL_GET_BUS_NUMBER (include/scsi/scsi_ioctl.h), which
// the C library's headers do not carry.
constexpr unsigned long kScsiGetBusNumber = 0x5386;
// Descriptors of its own start here, far above any real one.
constexpr int kFirstFd = 1 << 20;

// The tools the disk probes run; any other command goes to the shell as it is.
constexpr const char* kTools[] = {"hdparm", "smartctl", "lsmod"};
constexpr const char* kQuietErrors = " 2>/dev/null";

std::string Trimmed(std::string text) {
  while (!text.empty() && text.back() == ' ') text.pop_back();
  return text;
}

// A stream holding text, as a file or a finished tool reads.
FILE* StreamWith(const std::string& text) {
  FILE* file = std::tmpfile();
  if (file == nullptr) return nullptr;
  std::fwrite(text.data(), 1, text.size(), file);
  std::rewind(file);
  return file;
}

int CurrentOpen(const char* path, int flags, mode_t mode) { return g_current->Open(path, flags, mode); }
int CurrentClose(int fd) { return g_current->Close(fd); }
int CurrentIoctl(int fd, unsigned long request, void* argument) {
  return g_current->Ioctl(fd, request, argument);
}
ssize_t CurrentReadlink(const char* path, char* buffer, size_t size) {
  return g_current->Readlink(path, buffer, size);
}
FILE* CurrentFopen(const char* path, const char* mode) { return g_current->Fopen(path, mode); }
int CurrentFclose(FILE* file) { return g_current->Fclose(file); }
FILE* CurrentPopen(const char* command, const char* mode) { return g_current->Popen(command, mode); }
int CurrentPclose(FILE* pipe) { return g_current->Pclose(pipe); }
unsigned int CurrentSleep(unsigned int seconds) { return g_current->Sleep(seconds); }

}  // namespace

std::string IdentityBlock(const std::string& model, const std::string& serial) {
  std::string block(kIdentitySize, '\0');
  block.replace(kSerialOffset, kSerialLength, (serial + std::string(kSerialLength, ' ')).substr(0, kSerialLength));
  block.replace(kModelOffset, kModelLength, (model + std::string(kModelLength, ' ')).substr(0, kModelLength));
  return block;
}

DiskSim* DiskSim::Current() { return g_current; }

DiskSim::DiskSim() : previous_(os::Sys()), outer_(g_current), nextFd_(kFirstFd) {
  os::SysCalls calls = previous_;
  calls.open = CurrentOpen;
  calls.close = CurrentClose;
  calls.ioctl = CurrentIoctl;
  calls.readlink = CurrentReadlink;
  calls.fopen64 = CurrentFopen;
  calls.fclose = CurrentFclose;
  calls.popen = CurrentPopen;
  calls.pclose = CurrentPclose;
  calls.sleep = CurrentSleep;
  g_current = this;
  binding_ = std::make_unique<os::ScopedSysCalls>(calls);
}

DiskSim::~DiskSim() {
  binding_.reset();
  for (const auto& stream : streams_) {
    std::fclose(stream.first);
    if (!stream.second.empty()) unlink(stream.second.c_str());
  }
  g_current = outer_;
}

int DiskSim::Open(const char* path, int flags, mode_t mode) {
  if (devices.count(path) == 0) {
    // A disk node that is not here does not exist; other paths are not ours.
    if (std::strncmp(path, "/dev/s", std::strlen("/dev/s")) != 0) return previous_.open(path, flags, mode);
    opened.push_back(path);
    errno = ENOENT;
    return -1;
  }
  opened.push_back(path);
  fds_[nextFd_] = path;
  return nextFd_++;
}

int DiskSim::Close(int fd) {
  if (fds_.erase(fd) == 0) return previous_.close(fd);
  return 0;
}

int DiskSim::Ioctl(int fd, unsigned long request, void* argument) {
  auto it = fds_.find(fd);
  if (it == fds_.end()) return previous_.ioctl(fd, request, argument);
  if (Answer(devices.at(it->second), request, static_cast<unsigned char*>(argument))) return 0;
  errno = EIO;
  return -1;
}

bool DiskSim::Answer(SimDisk& disk, unsigned long request, unsigned char* bytes) {
  switch (request) {
    case HDIO_GET_IDENTITY:
      std::copy(disk.identity.begin(), disk.identity.end(), bytes);
      return !disk.identity.empty();
    case BLKGETSIZE64:
      std::memcpy(bytes, &disk.size, sizeof disk.size);
      return disk.size >= 0;
    case HDIO_DRIVE_CMD:
      std::copy(bytes, bytes + kDriveCmdArgs, lastDriveCommand.begin());
      if (disk.smartReads-- <= 0) return false;
      for (size_t i = 0; i < disk.attributes.size(); ++i)
        std::copy(disk.attributes[i].begin(), disk.attributes[i].end(),
                  bytes + kDriveCmdArgs + kAttributeTableOffset + i * sizeof(SmartEntry));
      return true;
    case kScsiGetBusNumber:
      std::memcpy(bytes, &disk.bus, sizeof disk.bus);
      return disk.bus >= 0;
  }
  errno = ENOTTY;
  return false;
}

ssize_t DiskSim::Readlink(const char* path, char* buffer, size_t size) {
  const std::string prefix = "/sys/class/block/";
  auto it = links.find(std::string(path).substr(std::min(prefix.size(), std::strlen(path))));
  if (std::strncmp(path, prefix.c_str(), prefix.size()) != 0 || it == links.end())
    return previous_.readlink(path, buffer, size);
  const size_t n = std::min(size, it->second.size());
  std::memcpy(buffer, it->second.data(), n);  // not terminated, like readlink
  return static_cast<ssize_t>(n);
}

FILE* DiskSim::Fopen(const char* path, const char* mode) {
  auto it = files.find(path);
  if (it == files.end()) return previous_.fopen64(path, mode);
  opened.push_back(path);
  if (std::strcmp(mode, "r") != 0) {
    errno = EACCES;
    return nullptr;
  }
  FILE* file = StreamWith(it->second);
  if (file != nullptr) streams_[file] = "";
  return file;
}

int DiskSim::Fclose(FILE* file) {
  if (streams_.erase(file) == 0) return previous_.fclose(file);
  return std::fclose(file);
}

FILE* DiskSim::Popen(const char* command, const char* mode) {
  std::string line(command);
  const std::string name = line.substr(0, line.find(' '));
  if (std::none_of(std::begin(kTools), std::end(kTools), [&](const char* tool) { return name == tool; }))
    return previous_.popen(command, mode);
  commands.push_back(line);
  if (pipeOpenFails || std::strcmp(mode, "r") != 0) {
    errno = EMFILE;
    return nullptr;
  }
  // The tool's part: up to the first '|', without its quieted errors.
  const size_t bar = std::min(line.find('|'), line.size());
  std::string tool = Trimmed(line.substr(0, bar));
  const size_t quiet = tool.rfind(kQuietErrors);
  if (quiet != std::string::npos && quiet + std::strlen(kQuietErrors) == tool.size()) tool.erase(quiet);
  auto output = tools.find(Trimmed(tool));
  char path[] = "/tmp/stbplat-disk-tool-XXXXXX";
  const int fd = mkstemp(path);
  if (fd < 0) return nullptr;
  FILE* captured = fdopen(fd, "w");
  if (output != tools.end()) std::fputs(output->second.c_str(), captured);
  std::fclose(captured);
  const std::string shell =
      pipeSilent ? ": '" + std::string(path) + "'" : "cat '" + std::string(path) + "'" + line.substr(bar);
  FILE* pipe = Libc().popen(shell.c_str(), mode);
  if (pipe == nullptr) {
    unlink(path);
    return nullptr;
  }
  streams_[pipe] = path;
  return pipe;
}

int DiskSim::Pclose(FILE* pipe) {
  auto it = streams_.find(pipe);
  if (it == streams_.end()) return previous_.pclose(pipe);
  const std::string captured = it->second;
  streams_.erase(it);
  const int status = Libc().pclose(pipe);
  unlink(captured.c_str());
  return pipeCloseFails ? -1 : status;
}

unsigned int DiskSim::Sleep(unsigned int seconds) {
  sleeps.push_back(seconds);
  if (!onSleep) return previous_.sleep(seconds);
  onSleep(seconds);
  return 0;
}

}  // namespace devmodel
}  // namespace stbplat
