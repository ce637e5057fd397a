#include "platform/NetCdfCheck.h"

#include <sys/stat.h>

#include <cstdint>
#include <cstdio>
#include <memory>
#include <vector>

namespace {

// Big-endian reader over the start of the file, growing its buffer as the header walk needs.
class HeaderReader {
 public:
  HeaderReader(std::FILE* f, std::uint64_t fileSize) : file_(f), fileSize_(fileSize) {}

  bool Bytes(std::uint64_t n) {
    if (n > fileSize_ || pos_ > fileSize_ - n) return false;
    while (buffer_.size() < pos_ + n) {
      const std::size_t chunk = 1 << 16;
      const std::size_t old = buffer_.size();
      buffer_.resize(old + chunk);
      const std::size_t got = std::fread(buffer_.data() + old, 1, chunk, file_);
      buffer_.resize(old + got);
      if (got == 0) return false;
    }
    return true;
  }
  bool Uint(int width, std::uint64_t& v) {
    if (!Bytes(static_cast<std::uint64_t>(width))) return false;
    v = 0;
    for (int i = 0; i < width; ++i) v = (v << 8) | buffer_[pos_ + i];
    pos_ += width;
    return true;
  }
  bool Skip(std::uint64_t n) {
    if (!Bytes(n)) return false;
    pos_ += n;
    return true;
  }
  std::uint64_t Position() const { return pos_; }
  // The next n bytes as text, without moving on.
  bool Text(std::uint64_t n, std::string& out) {
    if (!Bytes(n)) return false;
    out.assign(reinterpret_cast<const char*>(buffer_.data() + pos_), static_cast<std::size_t>(n));
    return true;
  }

 private:
  std::FILE* file_;
  std::uint64_t fileSize_;
  std::vector<unsigned char> buffer_;
  std::uint64_t pos_ = 0;
};

int TypeSize(std::uint64_t type) {
  switch (type) {
    case 1: case 2: case 7: return 1;   // byte, char, ubyte
    case 3: case 8: return 2;           // short, ushort
    case 4: case 5: case 9: return 4;   // int, float, uint
    case 6: case 10: case 11: return 8; // double, int64, uint64
    default: return 0;
  }
}

std::uint64_t Pad4(std::uint64_t n) { return (n + 3) & ~std::uint64_t{3}; }

struct Walk {
  HeaderReader& in;
  int nonNeg;   // width of counts and lengths: 4, or 8 in CDF-5
  int offset;   // width of data offsets: 4 in CDF-1, else 8
  std::string why;

  bool Fail(const char* text) {
    why = text;
    return false;
  }
  bool Name(std::string* out = nullptr) {
    std::uint64_t n = 0;
    if (!in.Uint(nonNeg, n) || n > 4096) return false;
    if (out != nullptr && !in.Text(n, *out)) return false;
    return in.Skip(Pad4(n));
  }
  // Tag and count of a list; absent lists have tag 0 and count 0.
  bool List(std::uint64_t wantTag, std::uint64_t& count) {
    std::uint64_t tag = 0;
    if (!in.Uint(4, tag) || !in.Uint(nonNeg, count)) return false;
    if (tag == 0 && count == 0) return true;
    return tag == wantTag;
  }
  bool Attributes() {
    std::uint64_t count = 0;
    if (!List(0x0C, count)) return false;
    for (std::uint64_t i = 0; i < count; ++i) {
      std::uint64_t type = 0, n = 0;
      if (!Name() || !in.Uint(4, type) || !in.Uint(nonNeg, n)) return false;
      const int size = TypeSize(type);
      if (size == 0 || n > UINT64_MAX / 8) return false;
      if (!in.Skip(Pad4(n * static_cast<std::uint64_t>(size)))) return false;
    }
    return true;
  }
};

}  // namespace

namespace {

// 1: a complete classic file (layout filled), 0: damaged (why set), -1: not a classic file.
int WalkClassic(const std::string& fileName, ClassicLayout& layout, std::string* why) {
  auto fail = [&](const std::string& text) {
    if (why != nullptr) *why = text;
    return 0;
  };
  struct stat st {};
  if (::stat(fileName.c_str(), &st) != 0) return fail("cannot be read");
  std::unique_ptr<std::FILE, int (*)(std::FILE*)> f(std::fopen(fileName.c_str(), "rb"), &std::fclose);
  if (!f) return fail("cannot be read");
  const std::uint64_t fileSize = static_cast<std::uint64_t>(st.st_size);
  HeaderReader in(f.get(), fileSize);
  std::uint64_t magic = 0;
  if (!in.Uint(4, magic)) return -1;  // too short to be a classic file: the library decides
  const std::uint64_t cdf = 0x43444600;  // "CDF\0"
  if ((magic & 0xFFFFFF00) != cdf) return -1;
  const int version = static_cast<int>(magic & 0xFF);
  if (version != 1 && version != 2 && version != 5) return -1;
  Walk w{in, version == 5 ? 8 : 4, version == 1 ? 4 : 8, {}};
  const char* damaged = "the file header is damaged or cut short";

  std::uint64_t numrecs = 0;
  if (!in.Uint(w.nonNeg, numrecs)) return fail(damaged);
  const std::uint64_t streaming = version == 5 ? UINT64_MAX : 0xFFFFFFFFu;
  if (numrecs == streaming) return fail("the file's record count was never written");

  std::uint64_t ndims = 0;
  if (!w.List(0x0A, ndims)) return fail(damaged);
  std::vector<std::uint64_t> dims;
  for (std::uint64_t i = 0; i < ndims; ++i) {
    std::uint64_t len = 0;
    if (!w.Name() || !in.Uint(w.nonNeg, len)) return fail(damaged);
    dims.push_back(len);  // 0: the record dimension
    if (dims.size() > fileSize) return fail(damaged);
  }
  if (!w.Attributes()) return fail(damaged);

  std::uint64_t nvars = 0;
  if (!w.List(0x0B, nvars)) return fail(damaged);
  struct Var { bool record; std::uint64_t begin, size, vsize; std::string name; };
  std::vector<Var> vars;
  for (std::uint64_t i = 0; i < nvars; ++i) {
    std::uint64_t nd = 0;
    Var v{false, 0, 1, 0, {}};
    if (!w.Name(&v.name) || !in.Uint(w.nonNeg, nd) || nd > dims.size() + 64) return fail(damaged);
    for (std::uint64_t d = 0; d < nd; ++d) {
      std::uint64_t id = 0;
      if (!in.Uint(w.nonNeg, id) || id >= dims.size()) return fail(damaged);
      if (dims[id] == 0) {
        if (d != 0) return fail(damaged);
        v.record = true;
      } else {
        if (v.size > fileSize / dims[id]) return fail("a variable is larger than the file");
        v.size *= dims[id];
      }
    }
    std::uint64_t type = 0;
    if (!w.Attributes() || !in.Uint(4, type) || TypeSize(type) == 0) return fail(damaged);
    if (v.size > fileSize / static_cast<std::uint64_t>(TypeSize(type)) + 1)
      return fail("a variable is larger than the file");
    v.size *= static_cast<std::uint64_t>(TypeSize(type));
    if (!in.Uint(w.nonNeg, v.vsize) || !in.Uint(w.offset, v.begin)) return fail(damaged);
    vars.push_back(v);
    if (vars.size() > fileSize) return fail(damaged);
  }
  if (in.Position() > fileSize) return fail(damaged);

  // Record size: the sum of the record variables' padded sizes (a lone record variable is not
  // padded).
  std::uint64_t recordVars = 0, recsize = 0;
  for (const Var& v : vars)
    if (v.record) {
      ++recordVars;
      recsize += Pad4(v.size);
    }
  if (recordVars == 1)
    for (const Var& v : vars)
      if (v.record) recsize = v.size;
  if (numrecs > 0 && recsize > 0 && numrecs > fileSize / recsize + 1)
    return fail("the file holds fewer records than its header claims");
  for (const Var& v : vars) {
    if (v.record && numrecs == 0) continue;  // no record data yet: may start past the end
    std::uint64_t end = v.begin + v.size;
    if (v.record) end = numrecs == 0 ? v.begin : v.begin + (numrecs - 1) * recsize + v.size;
    if (v.begin > fileSize || end > fileSize || end < v.begin)
      return fail(v.record ? "the file is cut short: it holds fewer records than its header claims"
                           : "the file is cut short: a variable's data lies past its end");
  }
  layout.version = version;
  layout.numrecs = numrecs;
  layout.numrecsWidth = w.nonNeg;
  layout.recordSize = recsize;
  layout.variables.clear();
  for (const Var& v : vars) layout.variables.push_back({v.name, v.record, v.begin, v.size});
  return 1;
}

}  // namespace

bool CheckClassicNetCdfSize(const std::string& fileName, std::string* why) {
  ClassicLayout layout;
  return WalkClassic(fileName, layout, why) != 0;
}

bool ReadClassicLayout(const std::string& fileName, ClassicLayout& layout, std::string* why) {
  const int result = WalkClassic(fileName, layout, why);
  if (result < 0 && why != nullptr) *why = "not a classic NetCDF file";
  return result == 1;
}
