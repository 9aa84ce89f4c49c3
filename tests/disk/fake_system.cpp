#include "disk/fake_system.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cerrno>
#include <cstring>

namespace stbplat {
namespace test {

const char* const kAtaLink =
    "../../devices/pci0000:00/0000:00:1f.2/ata1/host0/target0:0:0/0:0:0:0/block/sda";
const char* const kUsbLink =
    "../../devices/pci0000:00/0000:00:14.0/usb2/2-1/2-1:1.0/host6/target6:0:0/6:0:0:0/block/sdb";

namespace {

FakeSystem* g_current = nullptr;

constexpr unsigned long kHdioGetIdentity = 0x030D;
constexpr unsigned long kHdioDriveCmd = 0x031F;
constexpr unsigned long kBlkGetSize64 = 0x80081272;
constexpr unsigned long kScsiGetBusNumber = 0x5386;
constexpr size_t kIdentitySize = 512;
constexpr size_t kSerialAt = 20;
constexpr size_t kSerialWidth = 20;
constexpr size_t kModelAt = 54;
constexpr size_t kModelWidth = 40;
constexpr size_t kCommandArgs = 4;
constexpr size_t kTableAt = 2;
constexpr size_t kEntrySize = 12;
const char* const kSysBlock = "/sys/class/block/";

void PutPadded(unsigned char* at, const std::string& text, size_t width) {
  std::memset(at, ' ', width);
  std::memcpy(at, text.data(), std::min(text.size(), width));
}

FILE* StreamWith(const std::string& text) {
  FILE* file = std::tmpfile();
  if (file == nullptr) return nullptr;
  if (!text.empty()) std::fwrite(text.data(), 1, text.size(), file);
  std::rewind(file);
  return file;
}

}  // namespace

struct FakeCalls {
  static FakeSystem& S() { return *g_current; }

  static int Open(const char* path, int flags, mode_t mode) {
    S().opened_.push_back(path);
    S().openFlags_.push_back(flags);
    S().openModes_.push_back(mode);
    auto it = S().devices_.find(path);
    if (it == S().devices_.end() || !it->second.opens) {
      errno = ENOENT;
      return -1;
    }
    int fd = S().nextFd_++;
    S().openFds_[fd] = path;
    return fd;
  }

  static int Close(int fd) {
    if (S().openFds_.erase(fd) == 0) {
      ADD_FAILURE() << "close of descriptor " << fd << " that is not open";
      errno = EBADF;
      return -1;
    }
    return 0;
  }

  static int Ioctl(int fd, unsigned long request, void* argument) {
    auto open = S().openFds_.find(fd);
    if (open == S().openFds_.end()) {
      errno = EBADF;
      return -1;
    }
    FakeDevice& device = S().devices_[open->second];
    unsigned char* bytes = static_cast<unsigned char*>(argument);
    switch (request) {
      case kHdioGetIdentity:
        if (device.identityFails) break;
        if (!device.identity.empty()) {
          std::memcpy(bytes, device.identity.data(), std::min(device.identity.size(), kIdentitySize));
        } else {
          std::memset(bytes, 0, kIdentitySize);
          PutPadded(bytes + kSerialAt, device.serial, kSerialWidth);
          PutPadded(bytes + kModelAt, device.model, kModelWidth);
        }
        return 0;
      case kBlkGetSize64:
        if (device.sizeFails) break;
        std::memcpy(argument, &device.size, sizeof device.size);
        return 0;
      case kHdioDriveCmd: {
        std::memcpy(S().lastDriveCommand_.data(), bytes, kCommandArgs);
        if (device.smartFails) break;
        unsigned char* table = bytes + kCommandArgs + kTableAt;
        for (size_t i = 0; i < device.attributes.size(); ++i) {
          const SmartAttribute& a = device.attributes[i];
          unsigned char* entry = table + i * kEntrySize;
          entry[0] = a.id;
          entry[1] = 0x22;
          entry[3] = a.current;
          entry[4] = a.worst;
          std::memcpy(entry + 5, a.raw.data(), a.raw.size());
        }
        return 0;
      }
      case kScsiGetBusNumber:
        if (device.busFails) break;
        std::memcpy(argument, &device.bus, sizeof device.bus);
        return 0;
      default:
        errno = ENOTTY;
        return -1;
    }
    errno = EIO;
    return -1;
  }

  static ssize_t Readlink(const char* path, char* buffer, size_t size) {
    std::string p = path;
    S().linksRead_.push_back(p);
    auto it = p.rfind(kSysBlock, 0) == 0 ? S().links_.find(p.substr(std::strlen(kSysBlock)))
                                         : S().links_.end();
    if (it == S().links_.end()) {
      errno = ENOENT;
      return -1;
    }
    size_t n = std::min(size, it->second.size());
    std::memcpy(buffer, it->second.data(), n);  // not terminated, like readlink
    return static_cast<ssize_t>(n);
  }

  static FILE* Fopen64(const char* path, const char* mode) {
    S().opened_.push_back(path);
    auto it = S().files_.find(path);
    if (it == S().files_.end() || std::strcmp(mode, "r") != 0) {
      errno = ENOENT;
      return nullptr;
    }
    FILE* file = StreamWith(it->second);
    if (file != nullptr) S().openStreams_.insert(file);
    return file;
  }

  static int Fclose(FILE* file) {
    if (S().openStreams_.erase(file) == 0) ADD_FAILURE() << "fclose of a stream that is not open";
    return std::fclose(file);
  }

  static FILE* Popen(const char* command, const char* mode) {
    S().commands_.push_back(command);
    EXPECT_STREQ(mode, "r");
    if (S().failPipeOpen_) return nullptr;
    FILE* pipe = nullptr;
    if (S().realPipes_) {
      pipe = os::LibcSysCalls().popen(command, mode);
    } else {
      std::string output;
      for (const auto& entry : S().pipeOutputs_)
        if (std::strstr(command, entry.first.c_str()) != nullptr) {
          output = entry.second;
          break;
        }
      pipe = StreamWith(output);
    }
    if (pipe != nullptr) S().pipes_.insert(pipe);
    return pipe;
  }

  static int Pclose(FILE* pipe) {
    if (S().pipes_.erase(pipe) == 0) ADD_FAILURE() << "pclose of a pipe that is not open";
    int status = S().realPipes_ ? os::LibcSysCalls().pclose(pipe) : std::fclose(pipe);
    if (S().failPipeClose_) {
      errno = ECHILD;
      return -1;
    }
    return status;
  }

  static unsigned int Sleep(unsigned int seconds) {
    S().sleepSeconds_.push_back(seconds);
    if (--S().sleepsLeft_ <= 0) throw StopLoop();
    return 0;
  }
};

FakeSystem::FakeSystem() {
  EXPECT_EQ(g_current, nullptr) << "one FakeSystem at a time";
  g_current = this;
  os::SysCalls calls = os::LibcSysCalls();
  calls.open = FakeCalls::Open;
  calls.close = FakeCalls::Close;
  calls.ioctl = FakeCalls::Ioctl;
  calls.readlink = FakeCalls::Readlink;
  calls.fopen64 = FakeCalls::Fopen64;
  calls.fclose = FakeCalls::Fclose;
  calls.popen = FakeCalls::Popen;
  calls.pclose = FakeCalls::Pclose;
  calls.sleep = FakeCalls::Sleep;
  guard_.reset(new os::ScopedSysCalls(calls));
}

FakeSystem::~FakeSystem() {
  guard_.reset();
  EXPECT_TRUE(openFds_.empty()) << openFds_.size() << " descriptor(s) left open";
  EXPECT_TRUE(openStreams_.empty()) << openStreams_.size() << " stream(s) left open";
  EXPECT_TRUE(pipes_.empty()) << pipes_.size() << " pipe(s) left open";
  for (FILE* f : openStreams_) std::fclose(f);
  for (FILE* p : pipes_) realPipes_ ? os::LibcSysCalls().pclose(p) : std::fclose(p);
  g_current = nullptr;
}

FakeSystem& FakeSystem::Current() { return *g_current; }

void FakeSystem::AddBlockLink(const std::string& name, const std::string& target) {
  links_[name] = target;
}

FakeDevice& FakeSystem::AddDevice(const std::string& path) { return devices_[path]; }

void FakeSystem::AddFile(const std::string& path, const std::string& text) {
  files_[path] = text;
}

void FakeSystem::SetPipeOutput(const std::string& commandPart, const std::string& output) {
  pipeOutputs_.emplace_back(commandPart, output);
}

}  // namespace test
}  // namespace stbplat
