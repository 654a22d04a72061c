// A folder that lasts as long as a test, and what its files hold.
#pragma once

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
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

inline std::string content(std::filesystem::path const &file) {
  std::ifstream stream(file, std::ios::binary);
  return {std::istreambuf_iterator<char>(stream), {}};
}
