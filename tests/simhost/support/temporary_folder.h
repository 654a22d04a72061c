// A folder that lasts as long as a test.
#pragma once

#include <cstdlib>
#include <filesystem>
#include <stdexcept>
#include <string>

class TemporaryFolder {
 public:
  TemporaryFolder() {
    auto name = (std::filesystem::temp_directory_path() / "simhost-test-XXXXXX").string();
    if (mkdtemp(name.data()) == nullptr) {
      throw std::runtime_error("no temporary folder: " + name);
    }
    path_ = name;
  }
  ~TemporaryFolder() {
    std::error_code ignored;
    std::filesystem::remove_all(path_, ignored);
  }
  TemporaryFolder(TemporaryFolder const &) = delete;
  TemporaryFolder &operator=(TemporaryFolder const &) = delete;

  [[nodiscard]] std::filesystem::path file(char const *name) const { return path_ / name; }

 private:
  std::filesystem::path path_;
};
