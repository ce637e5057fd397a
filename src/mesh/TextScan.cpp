#include "mesh/TextScan.h"

#include "platform/Memory.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <charconv>
#include <cmath>
#include <cstring>
#include <limits>

std::string ReadWholeFile(const std::string& path) {
  const int fd = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
  if (fd < 0) throw MeshError("Unable to open file " + path + " (" + std::strerror(errno) + ")");
  struct stat st{};
  if (::fstat(fd, &st) != 0 || !S_ISREG(st.st_mode)) {
    ::close(fd);
    throw MeshError("Unable to open file " + path + " (not a regular file)");
  }
  std::string data;
  data.reserve(static_cast<std::size_t>(st.st_size));
  AdviseHugePages(data.data(), static_cast<std::size_t>(st.st_size));
  data.resize(static_cast<std::size_t>(st.st_size));
  std::size_t done = 0;
  while (done < data.size()) {
    const ssize_t n = ::read(fd, data.data() + done, data.size() - done);
    if (n < 0 && errno == EINTR) continue;
    if (n < 0) {
      const int err = errno;
      ::close(fd);
      throw MeshError("Unable to read file " + path + " (" + std::strerror(err) + ")");
    }
    if (n == 0) break;  // shrank while reading
    done += static_cast<std::size_t>(n);
  }
  data.resize(done);
  ::close(fd);
  return data;
}

namespace {
inline bool IsSeparator(char c) { return c == ' ' || c == '\t' || c == ',' || c == '\r'; }
}  // namespace

TextScanner::TextScanner(const char* data, std::size_t size, std::string name)
    : data_(data), size_(size), name_(std::move(name)) {}

bool TextScanner::NextLine(bool skipComments) {
  while (pos_ < size_) {
    const char* start = data_ + pos_;
    const void* nl = std::memchr(start, '\n', size_ - pos_);
    const std::size_t len =
        nl != nullptr ? static_cast<std::size_t>(static_cast<const char*>(nl) - start) : size_ - pos_;
    pos_ += len + (nl != nullptr ? 1 : 0);
    ++lineNumber_;
    line_ = std::string_view(start, len);
    cursor_ = 0;
    SkipSeparators();
    if (cursor_ >= line_.size()) continue;  // blank line
    if (skipComments && line_[cursor_] == '#') continue;
    return true;
  }
  line_ = {};
  cursor_ = 0;
  return false;
}

void TextScanner::RequireLine(std::string_view what, bool skipComments) {
  if (!NextLine(skipComments))
    throw MeshError(name_ + ": file ends early at line " + std::to_string(lineNumber_ + 1) +
                    " (expected " + std::string(what) + ")");
}

void TextScanner::SkipSeparators() {
  while (cursor_ < line_.size() && IsSeparator(line_[cursor_])) ++cursor_;
}

bool TextScanner::AtEnd() {
  SkipSeparators();
  return cursor_ >= line_.size();
}

std::string_view TextScanner::Field() {
  SkipSeparators();
  const std::size_t start = cursor_;
  while (cursor_ < line_.size() && !IsSeparator(line_[cursor_])) ++cursor_;
  return line_.substr(start, cursor_ - start);
}

namespace {

bool ParseInt(std::string_view f, std::int64_t& v) {
  if (f.empty()) return false;
  const char* b = f.data();
  const char* e = b + f.size();
  if (*b == '+') ++b;
  const auto r = std::from_chars(b, e, v);
  return r.ec == std::errc() && r.ptr == e;
}

bool ParseDouble(std::string_view f, double& v) {
  if (f.empty()) return false;
  const char* b = f.data();
  const char* e = b + f.size();
  if (*b == '+') ++b;
  auto r = std::from_chars(b, e, v);
  if (r.ec == std::errc() && r.ptr == e) return true;
  if (r.ec == std::errc::result_out_of_range && r.ptr == e) {
    // Overflow or underflow: strtod gives the saturated value.
    std::string copy(f);
    v = std::strtod(copy.c_str(), nullptr);
    return true;
  }
  // Fortran-style exponents ("1.5D+02").
  std::string copy(f);
  bool changed = false;
  for (char& c : copy)
    if (c == 'd' || c == 'D') { c = 'e'; changed = true; }
  if (!changed) return false;
  r = std::from_chars(copy.data() + (copy[0] == '+'), copy.data() + copy.size(), v);
  return r.ec == std::errc() && r.ptr == copy.data() + copy.size();
}

}  // namespace

std::int64_t TextScanner::Int(std::string_view what) {
  const std::string_view f = Field();
  if (f.empty()) Fail("missing " + std::string(what));
  std::int64_t v = 0;
  if (!ParseInt(f, v)) {
    // Integers written as reals ("12.0") are accepted when they are whole.
    double d = 0.0;
    if (ParseDouble(f, d) && std::isfinite(d) && d == std::floor(d) && std::fabs(d) < 9.0e15)
      return static_cast<std::int64_t>(d);
    Fail(std::string(what) + " \"" + std::string(f) + "\" is not an integer");
  }
  return v;
}

std::int32_t TextScanner::Int32(std::string_view what) {
  const std::int64_t v = Int(what);
  if (v < std::numeric_limits<std::int32_t>::min() || v > std::numeric_limits<std::int32_t>::max())
    Fail(std::string(what) + " " + std::to_string(v) + " is out of range");
  return static_cast<std::int32_t>(v);
}

double TextScanner::Double(std::string_view what) {
  const std::string_view f = Field();
  if (f.empty()) Fail("missing " + std::string(what));
  double v = 0.0;
  if (!ParseDouble(f, v)) Fail(std::string(what) + " \"" + std::string(f) + "\" is not a number");
  return v;
}

bool TextScanner::TryInt(std::int64_t& value) {
  const std::size_t save = cursor_;
  const std::string_view f = Field();
  if (ParseInt(f, value)) return true;
  cursor_ = save;
  return false;
}

bool TextScanner::TryDouble(double& value) {
  const std::size_t save = cursor_;
  const std::string_view f = Field();
  if (ParseDouble(f, value)) return true;
  cursor_ = save;
  return false;
}

std::string_view TextScanner::Rest() {
  SkipSeparators();
  std::string_view rest = line_.substr(cursor_);
  while (!rest.empty() && (rest.back() == ' ' || rest.back() == '\t' || rest.back() == '\r'))
    rest.remove_suffix(1);
  cursor_ = line_.size();
  return rest;
}

void TextScanner::Fail(std::string_view message) const {
  throw MeshError(name_ + ", line " + std::to_string(lineNumber_) + ": " + std::string(message));
}

void CheckCount(const TextScanner& scan, std::int64_t count, std::size_t minBytesPerItem,
                std::string_view what) {
  if (count < 0) scan.Fail("negative " + std::string(what) + " " + std::to_string(count));
  if (count > std::numeric_limits<std::int32_t>::max() - 1 ||
      static_cast<std::uint64_t>(count) * minBytesPerItem > scan.Remaining() + minBytesPerItem)
    scan.Fail(std::string(what) + " " + std::to_string(count) +
              " is more than the rest of the file can hold");
}
