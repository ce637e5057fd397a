// Helpers shared by the unit and end-to-end tests: scratch folders and whole-file reads.
#pragma once

#include <string>

namespace tavrintest {

// A fresh, empty folder under the system temporary folder, removed when the object goes.
class TempDir {
 public:
  TempDir();
  ~TempDir();
  TempDir(const TempDir&) = delete;
  TempDir& operator=(const TempDir&) = delete;
  const std::string& path() const { return path_; }
  // path() + "/" + name
  std::string file(const std::string& name) const;
  // Writes `text` to path()/name and returns the full path.
  std::string write(const std::string& name, const std::string& text) const;

 private:
  std::string path_;
};

// Whole file as text; "" when it cannot be read.
std::string ReadFile(const std::string& path);
bool FileExists(const std::string& path);
// Joins the lines of folded fatal-error messages (continuations indented by 13 blanks) so a
// test can look for the whole message text.
std::string Unfolded(const std::string& text);

}  // namespace tavrintest
