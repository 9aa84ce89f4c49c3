#include "disk/fake_system.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstring>

namespace stbplat {
namespace test {

namespace {

FakeSystem* g_sys = nullptr;

// Files and pipes are temporary files holding the text to read.
FILE* StreamWith(const std::string& text) {
  FILE* file = std::tmpfile();
  std::fwrite(text.data(), 1, text.size(), file);
  std::rewind(file);
  g_sys->openStreams.insert(file);
  return file;
}

bool Answer(FakeDevice& device, unsigned long request, unsigned char* bytes) {
  switch (request) {
    case 0x030D:  // HDIO_GET_IDENTITY
      std::copy(device.identity.begin(), device.identity.end(), bytes);
      return !device.identity.empty();
    case 0x80081272:  // BLKGETSIZE64
      std::memcpy(bytes, &device.size, sizeof device.size);
      return device.size >= 0;
    case 0x031F:  // HDIO_DRIVE_CMD: four command bytes, the table from data byte 2
      std::copy(bytes, bytes + 4, g_sys->lastDriveCommand.begin());
      if (device.smartReads-- <= 0) return false;
      for (size_t i = 0; i < device.attributes.size(); ++i)
        std::copy(device.attributes[i].begin(), device.attributes[i].end(),
                  bytes + 4 + 2 + i * sizeof(SmartEntry));
      return true;
    case 0x5386:  // SCSI_IOCTL_GET_BUS_NUMBER
      std::memcpy(bytes, &device.bus, sizeof device.bus);
      return device.bus >= 0;
  }
  return false;
}

int Fclose(FILE* file) {
  EXPECT_EQ(g_sys->openStreams.erase(file), 1u) << "close of a stream that is not open";
  return std::fclose(file);
}

os::SysCalls Calls() {
  os::SysCalls calls = os::LibcSysCalls();
  calls.open = [](const char* path, int, mode_t) {
    g_sys->opened.push_back(path);
    if (g_sys->devices.count(path) == 0) return -1;
    const int fd = 100 + static_cast<int>(g_sys->opened.size());
    g_sys->openFds[fd] = path;
    return fd;
  };
  calls.close = [](int fd) {
    EXPECT_EQ(g_sys->openFds.erase(fd), 1u) << "close of descriptor " << fd << " not open";
    return 0;
  };
  calls.ioctl = [](int fd, unsigned long request, void* argument) {
    FakeDevice& device = g_sys->devices.at(g_sys->openFds.at(fd));
    return Answer(device, request, static_cast<unsigned char*>(argument)) ? 0 : -1;
  };
  calls.readlink = [](const char* path, char* buffer, size_t size) -> ssize_t {
    auto it = g_sys->links.find(std::string(path).substr(std::strlen("/sys/class/block/")));
    if (it == g_sys->links.end()) return -1;
    const size_t n = std::min(size, it->second.size());
    std::memcpy(buffer, it->second.data(), n);  // not terminated, like readlink
    return static_cast<ssize_t>(n);
  };
  calls.fopen64 = [](const char* path, const char* mode) -> FILE* {
    g_sys->opened.push_back(path);
    auto it = g_sys->files.find(path);
    return it != g_sys->files.end() && std::strcmp(mode, "r") == 0 ? StreamWith(it->second) : nullptr;
  };
  calls.fclose = Fclose;
  calls.popen = [](const char* command, const char* mode) -> FILE* {
    g_sys->commands.push_back(command);
    if (g_sys->pipeOpenFails || std::strcmp(mode, "r") != 0) return nullptr;
    for (const auto& pipe : g_sys->pipes)
      if (std::strstr(command, pipe.first.c_str()) != nullptr) return StreamWith(pipe.second);
    return StreamWith("");
  };
  calls.pclose = [](FILE* pipe) {
    Fclose(pipe);
    return g_sys->pipeCloseFails ? -1 : 0;
  };
  calls.sleep = [](unsigned int seconds) -> unsigned int {
    g_sys->sleeps.push_back(seconds);
    if (g_sys->onSleep) g_sys->onSleep();
    if (--g_sys->sleepsLeft <= 0) throw StopLoop();
    return 0;
  };
  return calls;
}

}  // namespace

FakeSystem::FakeSystem() {
  g_sys = this;
  guard.reset(new os::ScopedSysCalls(Calls()));
}

FakeSystem::~FakeSystem() {
  EXPECT_TRUE(openFds.empty()) << openFds.size() << " descriptor(s) left open";
  EXPECT_TRUE(openStreams.empty()) << openStreams.size() << " stream(s) or pipe(s) left open";
  g_sys = nullptr;
}

}  // namespace test
}  // namespace stbplat
