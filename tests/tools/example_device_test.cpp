// The checked-in example device is what its generator writes today, and its
// images hold what the generator says.
#include <gtest/gtest.h>
#include <sys/wait.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <string>
#include <vector>

#include "scratch_dir.h"

namespace {

namespace fs = std::filesystem;
using stbplat::test::ScratchDir;

const std::string kDevice = std::string(STBPLAT_SOURCE_DIR) + "/examples/device";

std::vector<std::string> FilesUnder(const std::string& root) {
  std::vector<std::string> files;
  for (const auto& entry : fs::recursive_directory_iterator(root))
    if (entry.is_regular_file()) files.push_back(fs::relative(entry.path(), root).string());
  std::sort(files.begin(), files.end());
  return files;
}

TEST(ExampleDevice, CheckedInFilesMatchTheGenerator) {
  ScratchDir dir;
  std::string command = std::string(STBPLAT_MKEXAMPLE_PATH) + " " + dir.path() + "/device";
  ASSERT_EQ(0, std::system(command.c_str()));
  std::vector<std::string> generated = FilesUnder(dir / "device");
  std::vector<std::string> checkedIn = FilesUnder(kDevice);
  checkedIn.erase(std::remove(checkedIn.begin(), checkedIn.end(), "README.md"), checkedIn.end());
  ASSERT_EQ(generated, checkedIn) << "run examples/make-device.sh";
  ScratchDir reader;
  for (const std::string& file : generated)
    EXPECT_TRUE(dir.Read("device/" + file) == reader.Read(kDevice + "/" + file))
        << file << " differs; run examples/make-device.sh";
}

}  // namespace
