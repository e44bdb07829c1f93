#pragma once

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <string>
#include <string_view>
#include <system_error>
#include <vector>

/// The names of all that is in the directory, hidden ones included, sorted.
inline std::vector<std::string> namesIn(const std::string& directory) {
  std::vector<std::string> result;
  for (const auto& entry : std::filesystem::directory_iterator(directory)) {
    result.push_back(entry.path().filename().string());
  }
  std::sort(result.begin(), result.end());
  return result;
}

/// A new, empty directory that is removed with all its content at the end of the scope.
class TemporaryDirectory {
 public:
  TemporaryDirectory() {
    std::string path = (std::filesystem::temp_directory_path() / "qel-test-XXXXXX").string();
    if (::mkdtemp(path.data()) == nullptr) {
      throw std::runtime_error("no temporary directory could be made");
    }
    path_ = path;
  }
  ~TemporaryDirectory() {
    std::error_code ignored;
    std::filesystem::remove_all(path_, ignored);
  }
  TemporaryDirectory(const TemporaryDirectory&) = delete;
  TemporaryDirectory& operator=(const TemporaryDirectory&) = delete;

  const std::string& path() const { return path_; }
  /// The path of something in the directory.
  std::string operator/(std::string_view name) const { return path_ + "/" + std::string(name); }

  /// Puts a file there and gives its path.
  std::string addFile(std::string_view name, std::string_view content) const {
    std::ofstream(*this / name, std::ios::binary) << content;
    return *this / name;
  }

  std::vector<std::string> names() const { return namesIn(path_); }

 private:
  std::string path_;
};

/// The content of a file; empty when it cannot be read.
inline std::string contentOf(const std::string& path) {
  std::ifstream file(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
}
