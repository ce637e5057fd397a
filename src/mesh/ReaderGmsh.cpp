// Gmsh mesh files (.msh), versions 2.2 and 4.1, ASCII and binary.
//
// The whole file is parsed in memory in one pass. In ASCII files every value goes through
// TextScanner, so messages carry the line. Binary files mix text lines (section names,
// $PhysicalNames, the 2.2 counts) with binary blocks; the blocks are decoded from the bytes
// with a bounds check before every value, honouring the byte order that the check value "1"
// of $MeshFormat reveals. Every count that leads to a reservation is checked against the bytes
// left first, so a damaged header can neither allocate huge tables nor run past the data.
//
// Both encodings share the section parsers: a parser asks its input for "an int", "a size" or
// "a double" and the input reads the next text field or the next binary value. The records of
// 4.1 are laid out the same way in both encodings; 2.2 differs in the element blocks only.
//
// Kept: 3-node triangles (element type 21) and 4-node quadrangles (type 25), numbered 1..M in
// file order, and the nodes in increasing tag order numbered 1..N. Lines give the boundary
// codes of their nodes through their physical curves (AssignCodes); points are read for the
// range check of their node and dropped.
#include "mesh/ReaderGmsh.h"

#include <algorithm>
#include <bit>
#include <cctype>
#include <charconv>
#include <cstdint>
#include <cstring>
#include <limits>
#include <map>
#include <numeric>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "mesh/TextScan.h"

namespace {

constexpr std::int64_t kMaxCount = std::numeric_limits<std::int32_t>::max() - 2;

// A piece of the file shown in a message: at most 40 characters, non-printable bytes as '?'.
std::string Shown(std::string_view text) {
  std::string out;
  for (char c : text.substr(0, 40))
    out += std::isprint(static_cast<unsigned char>(c)) ? c : '?';
  if (text.size() > 40) out += "...";
  return out;
}

inline bool IsBlank(char c) { return c == ' ' || c == '\t' || c == '\r' || c == '\n'; }

// ---------------------------------------------------------------------------------------------
// Inputs. Int: a 32-bit value; Size: a non-negative count or tag (size_t in 4.1 binary files);
// Double: a coordinate. TextInt/TextCount/Name read the parts that are text in both encodings.

class AsciiInput {
 public:
  static constexpr bool kBinary = false;
  explicit AsciiInput(TextScanner& scan) : scan_(scan) {}

  std::int32_t Int(std::string_view what) {
    Next(what);
    return scan_.Int32(what);
  }
  std::int64_t Size(std::string_view what) {
    Next(what);
    const std::int64_t v = scan_.Int(what);
    if (v < 0) scan_.Fail(std::string(what) + " " + std::to_string(v) + " is negative");
    return v;
  }
  double Double(std::string_view what) {
    Next(what);
    return scan_.Double(what);
  }
  std::int32_t TextInt(std::string_view what) { return Int(what); }
  std::int64_t TextCount(std::string_view what) { return Size(what); }
  void EndTextLine(std::string_view) {}
  // The rest of the current line (a physical name).
  std::string_view Name() { return scan_.Rest(); }

  void Keyword(std::string_view word) {
    Next(word);
    const std::string_view f = scan_.Field();
    if (f != word) scan_.Fail("expected " + std::string(word) + ", found \"" + Shown(f) + "\"");
  }
  // Next line starting with '$' (lines between sections are ignored); false at the end.
  bool NextSection(std::string& name) {
    while (scan_.NextLine()) {
      const std::string_view f = scan_.Field();
      if (f[0] == '$') {
        name = std::string(f);
        return true;
      }
    }
    return false;
  }
  void SkipSection(const std::string& name) {
    const std::string end = "$End" + name.substr(1);
    const std::string shown = Shown(end);
    do scan_.RequireLine(shown);
    while (scan_.Field() != end);
  }
  void Check(std::int64_t count, std::size_t minBytes, std::string_view what) const {
    CheckCount(scan_, count, minBytes, what);
  }
  [[noreturn]] void Fail(std::string_view message) const { scan_.Fail(message); }

 private:
  // Values may continue on the next line, as Gmsh itself reads them.
  void Next(std::string_view what) {
    while (scan_.AtEnd()) scan_.RequireLine(what);
  }
  TextScanner& scan_;
};

class BinaryInput {
 public:
  static constexpr bool kBinary = true;
  BinaryInput(const char* data, std::size_t size, std::size_t pos, const std::string& name,
              bool swap)
      : data_(data), size_(size), pos_(pos), at_(pos), name_(name), swap_(swap) {}

  std::int32_t Int(std::string_view what) {
    std::uint32_t v;
    Get(&v, sizeof v, what);
    if (swap_) v = __builtin_bswap32(v);
    return std::bit_cast<std::int32_t>(v);
  }
  std::int64_t Size(std::string_view what) {
    const std::uint64_t v = Get64(what);
    if (v > static_cast<std::uint64_t>(std::numeric_limits<std::int64_t>::max()))
      Fail(std::string(what) + " " + std::to_string(v) + " is out of range");
    return static_cast<std::int64_t>(v);
  }
  double Double(std::string_view what) { return std::bit_cast<double>(Get64(what)); }

  std::int32_t TextInt(std::string_view what) {
    const std::int64_t v = TextValue(what);
    if (v < std::numeric_limits<std::int32_t>::min() || v > std::numeric_limits<std::int32_t>::max())
      Fail(std::string(what) + " " + std::to_string(v) + " is out of range");
    return static_cast<std::int32_t>(v);
  }
  std::int64_t TextCount(std::string_view what) {
    const std::int64_t v = TextValue(what);
    if (v < 0) Fail(std::string(what) + " " + std::to_string(v) + " is negative");
    return v;
  }
  // Binary data starts after the end of the text line holding its count.
  void EndTextLine(std::string_view what) {
    at_ = pos_;
    const void* nl = std::memchr(data_ + pos_, '\n', size_ - pos_);
    if (nl == nullptr) Early(what);
    pos_ = static_cast<std::size_t>(static_cast<const char*>(nl) - data_) + 1;
  }
  std::string_view Name() { return Line(); }

  void Keyword(std::string_view word) {
    const std::string_view f = Token(word);
    if (f != word) Fail("expected " + std::string(word) + ", found \"" + Shown(f) + "\"");
  }
  bool NextSection(std::string& name) {
    while (pos_ < size_) {
      at_ = pos_;
      std::string_view line = Line();
      if (!line.empty() && line[0] == '$') {
        name = std::string(line.substr(0, std::min(line.find_first_of(" \t"), line.size())));
        return true;
      }
    }
    return false;
  }
  // Unknown sections may hold binary data: the end is the first "\n$End<Name>" that is
  // followed by a blank or the end of the file.
  void SkipSection(const std::string& name) {
    const std::string end = "\n$End" + name.substr(1);
    const std::string_view all(data_, size_);
    std::size_t from = pos_ - 1;  // the header line's own newline: an empty section
    for (;;) {
      const std::size_t found = all.find(end, from);
      if (found == std::string_view::npos) {
        pos_ = size_;
        Early(Shown(end.substr(1)));
      }
      const std::size_t after = found + end.size();
      if (after == size_ || IsBlank(data_[after])) {
        pos_ = after;
        return;
      }
      from = found + 1;
    }
  }
  void Check(std::int64_t count, std::size_t minBytes, std::string_view what) const {
    if (count < 0) Fail("negative " + std::string(what) + " " + std::to_string(count));
    if (count > kMaxCount || static_cast<std::uint64_t>(count) * minBytes > size_ - pos_)
      Fail(std::string(what) + " " + std::to_string(count) +
           " is more than the rest of the file can hold");
  }
  [[noreturn]] void Fail(std::string_view message) const {
    throw MeshError(name_ + ", byte offset " + std::to_string(at_) + ": " + std::string(message));
  }

 private:
  [[noreturn]] void Early(std::string_view what) const {
    throw MeshError(name_ + ": file ends early at byte offset " + std::to_string(pos_) +
                    " (expected " + std::string(what) + ")");
  }
  void Get(void* out, std::size_t n, std::string_view what) {
    if (size_ - pos_ < n) Early(what);
    std::memcpy(out, data_ + pos_, n);
    at_ = pos_;
    pos_ += n;
  }
  std::uint64_t Get64(std::string_view what) {
    std::uint64_t v;
    Get(&v, sizeof v, what);
    return swap_ ? __builtin_bswap64(v) : v;
  }
  // Rest of the text line, blanks trimmed; the newline is consumed.
  std::string_view Line() {
    const char* start = data_ + pos_;
    const void* nl = std::memchr(start, '\n', size_ - pos_);
    const std::size_t len =
        nl != nullptr ? static_cast<std::size_t>(static_cast<const char*>(nl) - start) : size_ - pos_;
    pos_ += len + (nl != nullptr ? 1 : 0);
    std::string_view line(start, len);
    while (!line.empty() && IsBlank(line.front())) line.remove_prefix(1);
    while (!line.empty() && IsBlank(line.back())) line.remove_suffix(1);
    return line;
  }
  std::string_view Token(std::string_view what) {
    while (pos_ < size_ && IsBlank(data_[pos_])) ++pos_;
    if (pos_ >= size_) Early(what);
    at_ = pos_;
    while (pos_ < size_ && !IsBlank(data_[pos_])) ++pos_;
    return {data_ + at_, pos_ - at_};
  }
  std::int64_t TextValue(std::string_view what) {
    const std::string_view f = Token(what);
    std::int64_t v = 0;
    const auto r = std::from_chars(f.data(), f.data() + f.size(), v);
    if (r.ec != std::errc() || r.ptr != f.data() + f.size())
      Fail(std::string(what) + " \"" + Shown(f) + "\" is not an integer");
    return v;
  }

  const char* data_;
  std::size_t size_;
  std::size_t pos_;
  std::size_t at_;  // start of the last value read, for messages
  const std::string& name_;
  bool swap_;
};

// ---------------------------------------------------------------------------------------------
// What the sections deliver.

struct Line {
  std::int32_t a, b;      // node numbers
  std::int32_t physical;  // physical curve tag (> 0)
};

struct GmshMesh {
  std::string name;
  int major = 0;  // 2 or 4
  std::map<std::int32_t, std::string> curveNames;  // physical names of dimension 1
  std::unordered_map<std::int32_t, std::vector<std::int32_t>> curvePhysicals;  // 4.1 $Entities
  bool haveEntities = false, haveNodes = false, haveElements = false, warnedNoEntities = false;
  // Nodes as read, sorted by tag once the section is complete.
  std::vector<std::int64_t> tags;
  std::vector<double> x, y, z;
  // Tag -> node number: a table when the tags are dense enough, else a hash map.
  std::vector<std::int32_t> dense;
  std::unordered_map<std::int64_t, std::int32_t> sparse;
  bool useDense = true;
  // Kept 2-D elements: type code and node numbers (3 or 4 each).
  std::vector<std::int32_t> elemType, elemNodes;
  std::vector<Line> lines;

  std::int32_t Number(std::int64_t tag) const {
    if (tag <= 0) return 0;
    if (useDense) return tag < static_cast<std::int64_t>(dense.size()) ? dense[tag] : 0;
    const auto it = sparse.find(tag);
    return it != sparse.end() ? it->second : 0;
  }
};

// Element types by their number of nodes; the unsupported ones are refused by name.
template <class In>
int NodesOfGmshType(const In& in, std::int32_t type) {
  switch (type) {
    case 1: return 2;   // line
    case 2: return 3;   // triangle
    case 3: return 4;   // quadrangle
    case 15: return 1;  // point
    default: break;
  }
  static constexpr std::int32_t k3d[] = {4, 5, 6, 7, 11, 12, 13, 14, 17, 18, 19, 29, 30, 31};
  static constexpr std::int32_t kHigher2d[] = {9, 10, 16, 20, 21, 22, 23, 24, 25, 36, 37};
  static constexpr std::int32_t kHigherLine[] = {8, 26, 27, 28};
  const std::string t = "gmsh element type " + std::to_string(type);
  if (std::find(std::begin(k3d), std::end(k3d), type) != std::end(k3d))
    in.Fail(t + ": 3-D elements are not supported in a 2-D mesh");
  if (std::find(std::begin(kHigher2d), std::end(kHigher2d), type) != std::end(kHigher2d))
    in.Fail(t + " (second or higher order 2-D element) is not supported; only 3-node triangles "
                "and 4-node quadrangles are read");
  if (std::find(std::begin(kHigherLine), std::end(kHigherLine), type) != std::end(kHigherLine))
    in.Fail(t + " (second or higher order line) is not supported; only first-order meshes are read");
  in.Fail(t + " is not supported (only lines, points, 3-node triangles and 4-node quadrangles "
              "are read)");
}

// One element read: range-checks its nodes, keeps 2-D elements, turns lines into boundary
// lines of each of their physical curves.
template <class In>
void TakeElement(const In& in, GmshMesh& g, std::int32_t type, std::int64_t tag,
                 const std::int64_t* nodeTags, int numNodes, const std::int32_t* physicals,
                 std::size_t numPhysicals) {
  std::int32_t nodes[4];
  for (int k = 0; k < numNodes; ++k) {
    nodes[k] = g.Number(nodeTags[k]);
    if (nodes[k] == 0)
      in.Fail("element " + std::to_string(tag) + ": node tag " + std::to_string(nodeTags[k]) +
              " is not defined in $Nodes");
  }
  if (type == 2 || type == 3) {
    if (static_cast<std::int64_t>(g.elemType.size()) >= kMaxCount) in.Fail("too many elements");
    g.elemType.push_back(type == 2 ? 21 : 25);
    g.elemNodes.insert(g.elemNodes.end(), nodes, nodes + numNodes);
  } else if (type == 1) {
    for (std::size_t k = 0; k < numPhysicals; ++k)
      if (physicals[k] > 0) g.lines.push_back({nodes[0], nodes[1], physicals[k]});
  }
}

// ---------------------------------------------------------------------------------------------
// Sections.

template <class In>
void ReadPhysicalNames(In& in, GmshMesh& g) {
  const std::int64_t n = in.TextCount("number of physical names");
  in.Check(n, 6, "number of physical names");
  for (std::int64_t i = 0; i < n; ++i) {
    const std::int32_t dim = in.TextInt("physical dimension");
    const std::int32_t tag = in.TextInt("physical tag");
    std::string_view text = in.Name();
    if (text.empty()) in.Fail("missing physical name");
    if (text.front() == '"') {
      const std::size_t close = text.find('"', 1);
      if (close == std::string_view::npos) in.Fail("physical name without its closing quote");
      text = text.substr(1, close - 1);
    }
    if (dim == 1) g.curveNames[tag] = std::string(text);
  }
  in.Keyword("$EndPhysicalNames");
}

// 4.1: the physical tags of the curves (the lines' entities); points, surfaces and volumes
// are read past.
template <class In>
void ReadEntities41(In& in, GmshMesh& g) {
  std::int64_t count[4];
  for (auto& c : count) c = in.Size("number of entities");
  for (int dim = 0; dim < 4; ++dim) {
    in.Check(count[dim], In::kBinary ? (dim == 0 ? 36 : 68) : (dim == 0 ? 10 : 18),
             "number of entities");
    for (std::int64_t i = 0; i < count[dim]; ++i) {
      const std::int32_t tag = in.Int("entity tag");
      for (int k = 0; k < (dim == 0 ? 3 : 6); ++k) in.Double("entity coordinate");
      const std::int64_t numPhysicals = in.Size("number of physical tags");
      std::vector<std::int32_t>* physicals = dim == 1 ? &g.curvePhysicals[tag] : nullptr;
      for (std::int64_t k = 0; k < numPhysicals; ++k) {
        const std::int32_t p = in.Int("physical tag");
        if (physicals != nullptr) physicals->push_back(p);
      }
      if (dim == 0) continue;
      const std::int64_t numBounding = in.Size("number of bounding entities");
      for (std::int64_t k = 0; k < numBounding; ++k) in.Int("bounding entity tag");
    }
  }
  in.Keyword("$EndEntities");
  g.haveEntities = true;
}

template <class In>
void ReadNode(In& in, GmshMesh& g, std::int64_t tag) {
  if (tag <= 0) in.Fail("node tag " + std::to_string(tag) + " is not positive");
  g.tags.push_back(tag);
}

template <class In>
void ReadNodes22(In& in, GmshMesh& g) {
  const std::int64_t n = in.TextCount("number of nodes");
  in.Check(n, In::kBinary ? 28 : 8, "number of nodes");
  in.EndTextLine("node data");
  g.tags.reserve(n);
  g.x.reserve(n);
  g.y.reserve(n);
  g.z.reserve(n);
  for (std::int64_t i = 0; i < n; ++i) {
    ReadNode(in, g, in.Int("node tag"));
    g.x.push_back(in.Double("node x"));
    g.y.push_back(in.Double("node y"));
    g.z.push_back(in.Double("node z"));
  }
  in.Keyword("$EndNodes");
}

template <class In>
void ReadNodes41(In& in, GmshMesh& g) {
  const std::int64_t numBlocks = in.Size("number of node blocks");
  const std::int64_t total = in.Size("number of nodes");
  in.Size("smallest node tag");
  in.Size("largest node tag");
  in.Check(numBlocks, In::kBinary ? 20 : 8, "number of node blocks");
  in.Check(total, In::kBinary ? 32 : 8, "number of nodes");
  g.tags.reserve(total);
  g.x.reserve(total);
  g.y.reserve(total);
  g.z.reserve(total);
  for (std::int64_t b = 0; b < numBlocks; ++b) {
    const std::int32_t dim = in.Int("entity dimension");
    in.Int("entity tag");
    const std::int32_t parametric = in.Int("parametric flag");
    const std::int64_t n = in.Size("number of nodes in the block");
    if (dim < 0 || dim > 3) in.Fail("entity dimension " + std::to_string(dim) + " is not 0 to 3");
    if (parametric != 0 && parametric != 1)
      in.Fail("parametric flag " + std::to_string(parametric) + " is not 0 or 1");
    const int numParameters = parametric != 0 ? dim : 0;
    in.Check(n, In::kBinary ? 8 * (4 + numParameters) : 8, "number of nodes in the block");
    if (n > total - static_cast<std::int64_t>(g.tags.size()))
      in.Fail("the node blocks hold more than the " + std::to_string(total) +
              " nodes the section header gives");
    for (std::int64_t i = 0; i < n; ++i) ReadNode(in, g, in.Size("node tag"));
    for (std::int64_t i = 0; i < n; ++i) {
      g.x.push_back(in.Double("node x"));
      g.y.push_back(in.Double("node y"));
      g.z.push_back(in.Double("node z"));
      for (int k = 0; k < numParameters; ++k) in.Double("node parameter");
    }
  }
  if (static_cast<std::int64_t>(g.tags.size()) != total)
    in.Fail("the node blocks hold " + std::to_string(g.tags.size()) + " nodes, the section header " +
            std::to_string(total));
  in.Keyword("$EndNodes");
}

// Sorts the nodes by tag and builds the tag -> number map.
template <class In>
void IndexNodes(const In& in, GmshMesh& g) {
  const std::size_t n = g.tags.size();
  if (!std::is_sorted(g.tags.begin(), g.tags.end())) {
    std::vector<std::int32_t> order(n);
    std::iota(order.begin(), order.end(), 0);
    std::stable_sort(order.begin(), order.end(),
                     [&](std::int32_t a, std::int32_t b) { return g.tags[a] < g.tags[b]; });
    auto permute = [&](auto& v) {
      std::remove_reference_t<decltype(v)> sorted(n);
      for (std::size_t i = 0; i < n; ++i) sorted[i] = v[order[i]];
      v.swap(sorted);
    };
    permute(g.tags);
    permute(g.x);
    permute(g.y);
    permute(g.z);
  }
  for (std::size_t i = 1; i < n; ++i)
    if (g.tags[i] == g.tags[i - 1])
      in.Fail("node tag " + std::to_string(g.tags[i]) + " is defined twice in $Nodes");
  const std::int64_t maxTag = n > 0 ? g.tags.back() : 0;
  g.useDense = maxTag <= 4 * static_cast<std::int64_t>(n) + 1000;
  if (g.useDense) {
    g.dense.assign(static_cast<std::size_t>(maxTag) + 1, 0);
    for (std::size_t i = 0; i < n; ++i) g.dense[g.tags[i]] = static_cast<std::int32_t>(i + 1);
  } else {
    g.sparse.reserve(n);
    for (std::size_t i = 0; i < n; ++i) g.sparse.emplace(g.tags[i], static_cast<std::int32_t>(i + 1));
  }
}

template <class In>
void ReadElements22(In& in, GmshMesh& g) {
  const std::int64_t n = in.TextCount("number of elements");
  in.Check(n, 8, "number of elements");
  in.EndTextLine("element data");
  std::int64_t nodeTags[4];
  std::int32_t physical = 0;
  // Tags: the physical tag first, then the elementary entity and partitions (not used).
  auto readTags = [&](std::int32_t numTags) {
    if (numTags < 0 || numTags > 1000)
      in.Fail("number of element tags " + std::to_string(numTags) + " is not 0 to 1000");
    physical = 0;
    for (std::int32_t k = 0; k < numTags; ++k) {
      const std::int32_t t = in.Int("element tag");
      if (k == 0) physical = t;
    }
  };
  if constexpr (In::kBinary) {
    // Blocks of elements of one type: type, count, number of tags, then the elements.
    for (std::int64_t done = 0; done < n;) {
      const std::int32_t type = in.Int("element type");
      const std::int32_t count = in.Int("number of elements in the block");
      const std::int32_t numTags = in.Int("number of element tags");
      if (count < 0 || count > n - done)
        in.Fail("element block of " + std::to_string(count) + " elements where " +
                std::to_string(n - done) + " are left of the section header's count");
      if (numTags < 0 || numTags > 1000)
        in.Fail("number of element tags " + std::to_string(numTags) + " is not 0 to 1000");
      const int numNodes = NodesOfGmshType(in, type);
      in.Check(count, 4 * static_cast<std::size_t>(1 + numTags + numNodes),
               "number of elements in the block");
      for (std::int32_t i = 0; i < count; ++i) {
        const std::int32_t tag = in.Int("element number");
        readTags(numTags);
        for (int k = 0; k < numNodes; ++k) nodeTags[k] = in.Int("element node tag");
        TakeElement(in, g, type, tag, nodeTags, numNodes, &physical, 1);
      }
      done += count;
    }
  } else {
    for (std::int64_t i = 0; i < n; ++i) {
      const std::int32_t tag = in.Int("element number");
      const std::int32_t type = in.Int("element type");
      const std::int32_t numTags = in.Int("number of element tags");
      const int numNodes = NodesOfGmshType(in, type);
      readTags(numTags);
      for (int k = 0; k < numNodes; ++k) nodeTags[k] = in.Int("element node tag");
      TakeElement(in, g, type, tag, nodeTags, numNodes, &physical, 1);
    }
  }
  in.Keyword("$EndElements");
}

template <class In>
void ReadElements41(In& in, GmshMesh& g, MeshReadReport& report) {
  const std::int64_t numBlocks = in.Size("number of element blocks");
  const std::int64_t total = in.Size("number of elements");
  in.Size("smallest element tag");
  in.Size("largest element tag");
  in.Check(numBlocks, In::kBinary ? 20 : 8, "number of element blocks");
  in.Check(total, In::kBinary ? 16 : 4, "number of elements");
  std::int64_t seen = 0;
  std::int64_t nodeTags[4];
  for (std::int64_t b = 0; b < numBlocks; ++b) {
    const std::int32_t dim = in.Int("entity dimension");
    const std::int32_t entity = in.Int("entity tag");
    const std::int32_t type = in.Int("element type");
    const std::int64_t n = in.Size("number of elements in the block");
    const int numNodes = NodesOfGmshType(in, type);
    in.Check(n, In::kBinary ? 8 * (1 + numNodes) : 2 * (1 + numNodes),
             "number of elements in the block");
    if (n > total - seen)
      in.Fail("the element blocks hold more than the " + std::to_string(total) +
              " elements the section header gives");
    // The physical curves of a line block are those of its curve entity.
    const std::vector<std::int32_t>* physicals = nullptr;
    if (type == 1 && dim == 1) {
      const auto it = g.curvePhysicals.find(entity);
      if (it != g.curvePhysicals.end()) physicals = &it->second;
      if (!g.haveEntities && !g.warnedNoEntities && n > 0) {
        report.warnings.push_back(g.name + ": lines but no $Entities section; the physical curves "
                                  "are unknown and the outer boundary is taken as land");
        g.warnedNoEntities = true;
      }
    }
    for (std::int64_t i = 0; i < n; ++i) {
      const std::int64_t tag = in.Size("element tag");
      for (int k = 0; k < numNodes; ++k) nodeTags[k] = in.Size("element node tag");
      TakeElement(in, g, type, tag, nodeTags, numNodes,
                  physicals != nullptr ? physicals->data() : nullptr,
                  physicals != nullptr ? physicals->size() : 0);
    }
    seen += n;
  }
  if (seen != total)
    in.Fail("the element blocks hold " + std::to_string(seen) + " elements, the section header " +
            std::to_string(total));
  in.Keyword("$EndElements");
}

template <class In>
void ReadSections(In& in, GmshMesh& g, MeshReadReport& report) {
  std::string section;
  while (in.NextSection(section)) {
    if (section == "$PhysicalNames") {
      ReadPhysicalNames(in, g);
    } else if (section == "$Entities" && g.major == 4) {
      ReadEntities41(in, g);
    } else if (section == "$Nodes") {
      if (g.haveNodes) in.Fail("second $Nodes section");
      if (g.major == 4) ReadNodes41(in, g);
      else ReadNodes22(in, g);
      IndexNodes(in, g);
      g.haveNodes = true;
    } else if (section == "$Elements") {
      if (!g.haveNodes) in.Fail("$Elements section before the $Nodes section");
      if (g.haveElements) in.Fail("second $Elements section");
      if (g.major == 4) ReadElements41(in, g, report);
      else ReadElements22(in, g);
      g.haveElements = true;
    } else if (section == "$MeshFormat") {
      in.Fail("second $MeshFormat section");
    } else if (section.starts_with("$End")) {
      in.Fail("unexpected " + Shown(section) + " (no section is open)");
    } else {
      in.SkipSection(section);  // $NodeData, $Periodic, $Comments, $PartitionedEntities, ...
    }
  }
}

// ---------------------------------------------------------------------------------------------
// Boundary codes.
//
// Every node starts with code 0. The outer boundary is made of the element edges used by one
// element only. Lines whose physical curve is named "land" (any case), or is unnamed with tag
// 1, are land (code 1); the other physical curves get the codes 2, 3, ... in increasing order of
// their tags. A line on the outer boundary gives both its nodes its code; where curves meet,
// an open code beats land, and the lower of two open codes wins. A line inside the mesh (not
// an outer edge) gives its nodes that are not on the outer boundary the negative code instead
// (again the code nearest zero wins); inner land lines are ignored. Finally, outer boundary
// nodes that no curve covers are closed by land (code 1).

std::uint64_t EdgeKey(std::int32_t a, std::int32_t b) {
  if (a > b) std::swap(a, b);
  return (static_cast<std::uint64_t>(a) << 32) | static_cast<std::uint32_t>(b);
}

bool IsLand(const GmshMesh& g, std::int32_t tag) {
  const auto it = g.curveNames.find(tag);
  if (it == g.curveNames.end()) return tag == 1;
  std::string lower = it->second;
  for (char& c : lower) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
  return lower == "land";
}

std::vector<std::int32_t> AssignCodes(const GmshMesh& g, std::int32_t numNodes,
                                      MeshReadReport& report) {
  std::vector<std::uint64_t> edges;
  edges.reserve(g.elemNodes.size());
  std::size_t at = 0;
  for (const std::int32_t type : g.elemType) {
    const std::size_t nn = type == 21 ? 3 : 4;
    for (std::size_t k = 0; k < nn; ++k)
      edges.push_back(EdgeKey(g.elemNodes[at + k], g.elemNodes[at + (k + 1) % nn]));
    at += nn;
  }
  std::sort(edges.begin(), edges.end());
  std::vector<std::uint64_t> outer;  // sorted
  std::vector<char> onOuter(static_cast<std::size_t>(numNodes) + 1, 0);
  for (std::size_t i = 0; i < edges.size();) {
    std::size_t j = i + 1;
    while (j < edges.size() && edges[j] == edges[i]) ++j;
    if (j - i == 1) {
      outer.push_back(edges[i]);
      onOuter[edges[i] >> 32] = 1;
      onOuter[edges[i] & 0xffffffffu] = 1;
    }
    i = j;
  }
  edges = {};

  struct Curve {
    bool land = false, outerUse = false, innerUse = false;
    std::int32_t code = 0;
  };
  std::map<std::int32_t, Curve> curves;
  for (const Line& l : g.lines) curves[l.physical];
  std::int32_t next = 2;
  for (auto& [tag, c] : curves) {
    c.land = IsLand(g, tag);
    c.code = c.land ? 1 : next++;
  }

  std::vector<std::int32_t> code(static_cast<std::size_t>(numNodes) + 1, 0);
  for (const Line& l : g.lines) {
    Curve& c = curves[l.physical];
    const bool isOuter = std::binary_search(outer.begin(), outer.end(), EdgeKey(l.a, l.b));
    for (const std::int32_t n : {l.a, l.b}) {
      std::int32_t& cur = code[n];
      if (isOuter) {
        c.outerUse = true;
        if (cur <= 1) cur = std::max(cur, c.code);
        else if (c.code > 1) cur = std::min(cur, c.code);
      } else {
        c.innerUse = true;
        if (c.land || onOuter[n]) continue;
        cur = cur == 0 ? -c.code : -std::min(-cur, c.code);
      }
    }
  }
  for (std::int32_t n = 1; n <= numNodes; ++n)
    if (onOuter[n] && code[n] == 0) code[n] = 1;

  for (const auto& [tag, c] : curves) {
    const auto it = g.curveNames.find(tag);
    std::string label = "Gmsh physical curve " + std::to_string(tag);
    if (it != g.curveNames.end() && !it->second.empty()) label += " " + it->second;
    std::string value = "code " + std::to_string(c.land || c.outerUse ? c.code : -c.code);
    if (!c.land && c.outerUse && c.innerUse) value += ", inner lines " + std::to_string(-c.code);
    report.values.emplace_back(label, value);
    if (c.land && c.innerUse)
      report.warnings.push_back(g.name + ": lines of land curve " + std::to_string(tag) +
                                " inside the mesh are ignored");
  }
  return code;
}

}  // namespace

void ParseGmshData(MeshData& mesh, const char* data, std::size_t size, const std::string& name,
                   MeshReadReport& report) {
  GmshMesh g;
  g.name = name;

  // $MeshFormat: "version file-type data-size", then (binary) the check value 1 as an int.
  TextScanner scan(data, size, name);
  scan.RequireLine("$MeshFormat");
  const std::string_view first = scan.Field();
  if (first == "$NOD" || first == "$NOE") scan.Fail("MSH version 1 files are not supported");
  if (first != "$MeshFormat") scan.Fail("not a Gmsh mesh file (it does not begin with $MeshFormat)");
  scan.RequireLine("the format line (version, file type, data size)");
  const std::string version(scan.Field());
  const std::int32_t fileType = scan.Int32("file type");
  const std::int32_t dataSize = scan.Int32("data size");
  int major = -1, minor = 0;
  {
    const char* end = version.data() + version.size();
    auto r = std::from_chars(version.data(), end, major);
    if (r.ec == std::errc() && r.ptr != end && *r.ptr == '.')
      r = std::from_chars(r.ptr + 1, end, minor);
    if (r.ec != std::errc() || r.ptr != end) major = -1;
  }
  if (major == 4 && minor == 0)
    scan.Fail("MSH version 4.0 is not supported (save the mesh as version 4.1 or 2.2)");
  if (!(major == 2 && minor <= 2) && !(major == 4 && minor == 1))
    scan.Fail("MSH version " + Shown(version) + " is not supported (versions 2.2 and 4.1 are read)");
  if (fileType != 0 && fileType != 1)
    scan.Fail("file type " + std::to_string(fileType) + " is neither 0 (ASCII) nor 1 (binary)");
  g.major = major;
  report.values.emplace_back("Gmsh file format",
                             "MSH " + version + (fileType == 0 ? " ASCII" : " binary"));

  if (fileType == 0) {
    AsciiInput in(scan);
    in.Keyword("$EndMeshFormat");
    ReadSections(in, g, report);
  } else {
    if (dataSize != 8)
      scan.Fail("data size " + std::to_string(dataSize) + " is not supported (8 is read)");
    const std::size_t pos = size - scan.Remaining();
    if (size - pos < 4)
      throw MeshError(name + ": file ends early at byte offset " + std::to_string(size) +
                      " (expected the binary check value)");
    std::uint32_t one;
    std::memcpy(&one, data + pos, 4);
    if (one != 1 && __builtin_bswap32(one) != 1)
      throw MeshError(name + ", byte offset " + std::to_string(pos) +
                      ": the binary check value is not 1 in either byte order");
    BinaryInput in(data, size, pos + 4, name, one != 1);
    in.Keyword("$EndMeshFormat");
    ReadSections(in, g, report);
  }

  if (!g.haveNodes) throw MeshError("no $Nodes section in " + name);
  if (g.elemType.empty()) throw MeshError("no triangles or quadrilaterals in " + name);

  const auto numNodes = static_cast<std::int32_t>(g.tags.size());
  const std::vector<std::int32_t> code = AssignCodes(g, numNodes, report);
  AllocateNodes(mesh.nodes, numNodes);
  for (std::int32_t n = 1; n <= numNodes; ++n)
    AddNode(mesh.nodes, n, g.x[n - 1], g.y[n - 1], g.z[n - 1], code[n]);
  AllocateElementsBasic(mesh.elements, static_cast<std::int64_t>(g.elemType.size()),
                        static_cast<std::int64_t>(g.elemNodes.size()));
  std::size_t at = 0;
  for (std::size_t e = 0; e < g.elemType.size(); ++e) {
    const std::int32_t nn = g.elemType[e] == 21 ? 3 : 4;
    AddElement(mesh.elements, static_cast<std::int32_t>(e + 1), g.elemType[e], nn, &g.elemNodes[at]);
    at += nn;
  }
  mesh.dimension = 2;
}

void ReadMeshGmsh(MeshData& mesh, const std::string& path, MeshReadReport& report) {
  const std::string data = ReadWholeFile(path);
  ParseGmshData(mesh, data.data(), data.size(), path, report);
}
