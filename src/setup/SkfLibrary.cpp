// Setup-file library: a single-pass scanner over the whole file in memory and a flat, read-only
// tree built from it.
//
// Layout of a loaded file. The file text stays in memory, and names, string values and the raw
// text of parameters are (offset, length) spans into it; strings that contained escapes keep
// their unescaped text in a second arena. Blocks, keywords and parameters live in three flat
// vectors that are sized once when parsing ends, so handles (pointers into them) stay valid until
// skfClose. A block's keywords are contiguous in the keyword vector and a keyword's parameters
// contiguous in the parameter vector; a block's sections are a contiguous run of block indices.
// Lines and columns are not stored per node: a table of line starts turns any text offset back
// into a line and column.
//
// Lookup by name and instance scans the children of blocks with few children; blocks with many
// children (and a file with many targets) get a name-sorted index, built at load time together
// with the instance numbers, and are searched by binary search.
#include "setup/SkfLibrary.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cfloat>
#include <charconv>
#include <cmath>
#include <cstring>
#include <memory>
#include <new>
#include <string>
#include <string_view>
#include <system_error>
#include <utility>
#include <vector>

namespace {

constexpr std::uint32_t kNone = 0xFFFFFFFFu;
// Blocks with more children than this get a sorted name index.
constexpr std::uint32_t kIndexThreshold = 16;
// Offsets are 32-bit; line numbers are int.
constexpr std::size_t kMaxFileBytes = 0x7FFFFFFFu;
// Tokens quoted in messages are cut to this many bytes.
constexpr std::size_t kQuoteBytes = 40;

thread_local int g_error = SKF_OK;

struct Span {
  std::uint32_t off;
  std::uint32_t len;
};

}  // namespace

struct SkfParam {
  const SkfFile* file;
  union {
    std::int32_t i;  // Int, Bool (0 / 1)
    double d;        // Double
    Span s;          // String, Filename: the text without quotes or brackets
  } value;
  std::uint32_t rawOff;  // the parameter as written
  std::uint32_t rawLen;
  SkfParamType type;
  bool unescaped;  // String whose text lives in SkfFile::unescaped
};

struct SkfKeyword {
  SkfBlock* block;
  std::uint32_t nameOff;
  std::uint32_t nameLen;
  std::uint32_t firstParam;
  std::uint32_t numParams;
  std::uint32_t instance;
  bool read;
};

struct SkfBlock {
  SkfFile* file;
  SkfBlock* parent;
  std::uint32_t nameOff;
  std::uint32_t nameLen;
  std::uint32_t level;
  std::uint32_t instance;
  std::uint32_t firstSection;  // into SkfFile::sections
  std::uint32_t numSections;
  std::uint32_t firstKeyword;  // into SkfFile::keywords
  std::uint32_t numKeywords;
  std::uint32_t sectionIndex;  // into SkfFile::sorted, kNone for few sections
  std::uint32_t keywordIndex;  // into SkfFile::sorted, kNone for few keywords
  bool read;
};

struct SkfFile {
  std::string name;    // as given to the loader
  std::string folder;  // base of relative file names
  std::unique_ptr<char[]> text;
  std::size_t textSize = 0;
  std::string unescaped;                 // texts of strings that held escapes
  std::vector<std::uint32_t> lineStarts;  // offset of the first byte of each line
  std::vector<SkfBlock> blocks;           // file order
  std::vector<std::uint32_t> targets;     // block indices of the targets, file order
  std::vector<std::uint32_t> sections;    // block indices grouped by parent, file order
  std::vector<SkfKeyword> keywords;       // grouped by block, file order
  std::vector<SkfParam> params;           // file order
  std::vector<std::uint32_t> sorted;      // name indices: local child positions sorted by name
  std::uint32_t targetIndex = kNone;

  bool failed = false;
  int errLine = 0;
  int errColumn = 0;
  std::string errMessage;

  std::string_view str(std::uint32_t off, std::uint32_t len) const {
    return {text.get() + off, len};
  }
  int lineOf(std::uint32_t off) const {
    const auto it = std::upper_bound(lineStarts.begin(), lineStarts.end(), off);
    const auto line = it - lineStarts.begin();
    return line < 1 ? 1 : static_cast<int>(line);
  }
  int columnOf(std::uint32_t off) const {
    const std::uint32_t start = lineStarts[static_cast<std::size_t>(lineOf(off) - 1)];
    return off >= start ? static_cast<int>(off - start) + 1 : 1;
  }
};

namespace {

// ---------------------------------------------------------------------------------------------
// Character classes

enum : std::uint8_t {
  kBlank = 1,      // ' ', '\t', '\r'
  kNameStart = 2,  // [A-Za-z_]
  kNameChar = 4,   // [A-Za-z0-9_]
  kTokenChar = 8,  // characters of a bare parameter token: [A-Za-z0-9_.+-]
};

constexpr std::array<std::uint8_t, 256> MakeClasses() {
  std::array<std::uint8_t, 256> c{};
  c[' '] = c['\t'] = c['\r'] = kBlank;
  for (int ch = 0; ch < 256; ++ch) {
    const bool alpha = (ch >= 'A' && ch <= 'Z') || (ch >= 'a' && ch <= 'z') || ch == '_';
    const bool digit = ch >= '0' && ch <= '9';
    if (alpha) c[static_cast<std::size_t>(ch)] |= kNameStart;
    if (alpha || digit) c[static_cast<std::size_t>(ch)] |= kNameChar | kTokenChar;
  }
  c['.'] |= kTokenChar;
  c['+'] |= kTokenChar;
  c['-'] |= kTokenChar;
  return c;
}
constexpr std::array<std::uint8_t, 256> kClass = MakeClasses();

inline bool Is(char ch, std::uint8_t cls) {
  return (kClass[static_cast<unsigned char>(ch)] & cls) != 0;
}

// Length of the valid UTF-8 sequence starting at s[0] (a byte >= 0x80), 0 when invalid.
// Rejects overlong forms, surrogates and code points above U+10FFFF.
std::size_t Utf8Sequence(const unsigned char* s, std::size_t avail) {
  const unsigned char b0 = s[0];
  std::size_t len;
  unsigned char lo = 0x80, hi = 0xBF;  // allowed range of the second byte
  if (b0 >= 0xC2 && b0 <= 0xDF) {
    len = 2;
  } else if (b0 >= 0xE0 && b0 <= 0xEF) {
    len = 3;
    if (b0 == 0xE0) lo = 0xA0;
    if (b0 == 0xED) hi = 0x9F;
  } else if (b0 >= 0xF0 && b0 <= 0xF4) {
    len = 4;
    if (b0 == 0xF0) lo = 0x90;
    if (b0 == 0xF4) hi = 0x8F;
  } else {
    return 0;
  }
  if (avail < len) return 0;
  if (s[1] < lo || s[1] > hi) return 0;
  for (std::size_t k = 2; k < len; ++k)
    if (s[k] < 0x80 || s[k] > 0xBF) return 0;
  return len;
}

// A token for a message, cut to kQuoteBytes.
std::string Clip(std::string_view text) {
  if (text.size() <= kQuoteBytes) return std::string(text);
  return std::string(text.substr(0, kQuoteBytes)) + "...";
}

std::string Quote(std::string_view text) { return "\"" + Clip(text) + "\""; }

std::string Hex(unsigned char b) {
  static const char digits[] = "0123456789ABCDEF";
  std::string h = "0x";
  h += digits[b >> 4];
  h += digits[b & 15];
  return h;
}

// Rough decimal exponent of an unsigned, well-formed literal (digits, '.', exponent): > 0 for
// values of 1 and above. Only its sign matters, and only far outside the double range.
long long DecimalMagnitude(std::string_view body) {
  std::size_t i = 0;
  long long mag = 0;
  bool nonzero = false;
  for (; i < body.size() && body[i] >= '0' && body[i] <= '9'; ++i) {
    if (body[i] != '0') nonzero = true;
    if (nonzero) ++mag;
  }
  if (i < body.size() && body[i] == '.') {
    for (++i; i < body.size() && body[i] >= '0' && body[i] <= '9'; ++i) {
      if (nonzero) continue;
      if (body[i] != '0') nonzero = true;
      else --mag;
    }
  }
  if (!nonzero) return 0;
  if (i < body.size()) {  // exponent, saturated
    ++i;
    const bool negative = body[i] == '-';
    if (body[i] == '+' || body[i] == '-') ++i;
    long long e = 0;
    for (; i < body.size(); ++i) e = std::min(e * 10 + (body[i] - '0'), 1000000000000LL);
    mag += negative ? -e : e;
  }
  return mag;
}

// ---------------------------------------------------------------------------------------------
// Parser

struct SyntaxFault {
  std::size_t pos;
  std::string message;
};

struct TmpBlock {
  std::uint32_t parent;  // kNone for a target
  std::uint32_t nameOff;
  std::uint32_t nameLen;
  std::uint32_t level;
};

struct TmpKeyword {
  std::uint32_t block;
  std::uint32_t nameOff;
  std::uint32_t nameLen;
  std::uint32_t firstParam;
  std::uint32_t numParams;
};

class Parser {
 public:
  explicit Parser(SkfFile& f)
      : f_(f), d_(f.text.get()), n_(f.textSize) {}

  // Parses the whole text into the temporary tables; throws SyntaxFault.
  void Run();
  // Builds the final tree in f_ from the temporary tables.
  void Finish();

 private:
  [[noreturn]] void Fail(std::size_t pos, std::string message) {
    throw SyntaxFault{pos, std::move(message)};
  }
  // Fails at an unexpected character: NUL, non-ASCII and control bytes get their own messages,
  // anything else "expected <what>, found <x>".
  [[noreturn]] void FailFound(std::size_t pos, const std::string& expected);
  std::string Describe(std::size_t pos) const;

  bool AtLineEnd() const {  // end of line, comment or end of file
    if (p_ >= n_) return true;
    const char c = d_[p_];
    return c == '\n' || c == '#' || (c == '/' && p_ + 1 < n_ && d_[p_ + 1] == '/');
  }
  bool AtKeywordEnd() const {
    return AtLineEnd() || d_[p_] == ';' || d_[p_] == '}';
  }
  void SkipBlanks() {
    while (p_ < n_ && Is(d_[p_], kBlank)) ++p_;
  }
  // Blanks, line ends and comments. Returns true when a line end was crossed.
  bool SkipSpace();
  void NewLine();  // at '\n': checks the line length and records the next line
  void CheckLineLength(std::size_t end);

  void Statement();
  void Keyword(std::size_t nameStart, std::size_t nameEnd);
  void Param();
  void StringParam(SkfParam& prm);
  void FilenameParam(SkfParam& prm);
  void TokenParam(SkfParam& prm);
  bool LooksLikeStatement() const;

  SkfFile& f_;
  const char* d_;
  std::size_t n_;
  std::size_t p_ = 0;
  std::size_t lineStart_ = 0;
  std::vector<std::uint32_t> open_;  // indices of the open blocks, innermost last
  std::vector<TmpBlock> blocks_;
  std::vector<TmpKeyword> keywords_;
};

std::string Parser::Describe(std::size_t pos) const {
  if (pos >= n_) return "end of file";
  const char c = d_[pos];
  if (c == '\n') return "end of line";
  if (Is(c, kNameChar)) {  // a word or number: quote all of it
    std::size_t e = pos;
    while (e < n_ && Is(d_[e], kTokenChar)) ++e;
    return Quote(std::string_view(d_ + pos, e - pos));
  }
  if (c == '"') return "a string";
  if (c == '<') return "a file name";
  std::string s = "'";
  s += c;
  s += '\'';
  return s;
}

void Parser::FailFound(std::size_t pos, const std::string& expected) {
  if (pos < n_) {
    const auto b = static_cast<unsigned char>(d_[pos]);
    if (b == 0) Fail(pos, "NUL byte in file");
    if (b >= 0x80)
      Fail(pos, "non-ASCII character outside a string, file name or comment");
    if (b < 0x20 && b != '\n' && b != '\t' && b != '\r')
      Fail(pos, "unexpected control character " + Hex(b) + ", expected " + expected);
    if (b == 0x7F) Fail(pos, "unexpected control character 0x7F, expected " + expected);
  }
  Fail(pos, "expected " + expected + ", found " + Describe(pos));
}

void Parser::CheckLineLength(std::size_t end) {
  if (end - lineStart_ > kSkfMaxLineBytes)
    Fail(lineStart_ + kSkfMaxLineBytes,
         "line longer than " + std::to_string(kSkfMaxLineBytes) + " bytes");
}

void Parser::NewLine() {
  CheckLineLength(p_);
  ++p_;
  lineStart_ = p_;
  f_.lineStarts.push_back(static_cast<std::uint32_t>(p_));
}

bool Parser::SkipSpace() {
  bool crossed = false;
  while (p_ < n_) {
    const char c = d_[p_];
    if (Is(c, kBlank)) {
      ++p_;
    } else if (c == '\n') {
      NewLine();
      crossed = true;
    } else if (c == '#' || (c == '/' && p_ + 1 < n_ && d_[p_ + 1] == '/')) {
      const void* nl = std::memchr(d_ + p_, '\n', n_ - p_);
      const std::size_t end = nl != nullptr ? static_cast<std::size_t>(static_cast<const char*>(nl) - d_) : n_;
      const void* nul = std::memchr(d_ + p_, '\0', end - p_);
      if (nul != nullptr) {
        const auto at = static_cast<std::size_t>(static_cast<const char*>(nul) - d_);
        CheckLineLength(at);
        Fail(at, "NUL byte in file");
      }
      p_ = end;
    } else {
      break;
    }
  }
  return crossed;
}

void Parser::Run() {
  if (n_ >= 3 && static_cast<unsigned char>(d_[0]) == 0xEF &&
      static_cast<unsigned char>(d_[1]) == 0xBB && static_cast<unsigned char>(d_[2]) == 0xBF)
    p_ = 3;
  lineStart_ = p_;
  f_.lineStarts.push_back(static_cast<std::uint32_t>(p_));
  for (;;) {
    SkipSpace();
    if (p_ >= n_) break;
    const char c = d_[p_];
    if (c == '}') {
      if (open_.empty()) Fail(p_, "unexpected '}'");
      open_.pop_back();
      ++p_;
    } else if (Is(c, kNameStart)) {
      Statement();
    } else if (open_.empty()) {
      FailFound(p_, "a block name");
    } else {
      FailFound(p_, "a keyword, a block or '}'");
    }
  }
  CheckLineLength(n_);
  if (!open_.empty()) {
    const TmpBlock& b = blocks_[open_.back()];
    Fail(n_, "block " + Quote(std::string_view(d_ + b.nameOff, b.nameLen)) + " opened at line " +
                 std::to_string(f_.lineOf(b.nameOff)) + " is not closed");
  }
}

void Parser::Statement() {
  const std::size_t nameStart = p_;
  while (p_ < n_ && Is(d_[p_], kNameChar)) ++p_;
  const std::size_t nameEnd = p_;
  const std::string_view name(d_ + nameStart, nameEnd - nameStart);
  SkipBlanks();
  if (p_ < n_ && d_[p_] == '=') {
    if (open_.empty())
      Fail(nameStart, "keyword " + Quote(name) +
                          " outside any block: only blocks may stand at the top level");
    ++p_;
    Keyword(nameStart, nameEnd);
    return;
  }
  const bool crossed = SkipSpace();
  if (p_ < n_ && d_[p_] == '{') {
    if (open_.size() >= static_cast<std::size_t>(kSkfMaxNesting))
      Fail(nameStart, "blocks nested deeper than " + std::to_string(kSkfMaxNesting) + " levels");
    const auto parent = open_.empty() ? kNone : open_.back();
    open_.push_back(static_cast<std::uint32_t>(blocks_.size()));
    blocks_.push_back({parent, static_cast<std::uint32_t>(nameStart),
                       static_cast<std::uint32_t>(nameEnd - nameStart),
                       static_cast<std::uint32_t>(open_.size() - 1)});
    ++p_;
    return;
  }
  if (open_.empty()) FailFound(p_, "'{' after block name " + Quote(name));
  if (crossed && p_ < n_ && d_[p_] == '=')
    Fail(p_, "expected '=' or '{' after name " + Quote(name) +
                 ", found '=' on a later line (a keyword's '=' must be on the line of its name)");
  FailFound(p_, "'=' or '{' after name " + Quote(name));
}

// After a ',' and a line end: does the next line start like a keyword or block?
bool Parser::LooksLikeStatement() const {
  std::size_t q = p_;
  if (q >= n_ || !Is(d_[q], kNameStart)) return false;
  while (q < n_ && Is(d_[q], kNameChar)) ++q;
  const std::string_view word(d_ + p_, q - p_);
  if (word == "true" || word == "false") return false;
  while (q < n_ && (Is(d_[q], kBlank) || d_[q] == '\n')) ++q;
  return q < n_ && (d_[q] == '=' || d_[q] == '{');
}

void Parser::Keyword(std::size_t nameStart, std::size_t nameEnd) {
  TmpKeyword kw{open_.back(), static_cast<std::uint32_t>(nameStart),
                static_cast<std::uint32_t>(nameEnd - nameStart),
                static_cast<std::uint32_t>(f_.params.size()), 0};
  SkipBlanks();
  if (!AtKeywordEnd()) {
    for (;;) {
      Param();
      SkipBlanks();
      if (p_ < n_ && d_[p_] == ',') {
        const std::size_t comma = p_;
        ++p_;
        SkipBlanks();
        const bool crossed = AtLineEnd() && SkipSpace();
        if (p_ >= n_ || d_[p_] == '}' || d_[p_] == ';' || (crossed && LooksLikeStatement()))
          Fail(comma, "expected a parameter after ','");
        continue;
      }
      if (AtKeywordEnd()) break;
      FailFound(p_, "',' or the end of the keyword after a parameter");
    }
  }
  if (p_ < n_ && d_[p_] == ';') ++p_;
  kw.numParams = static_cast<std::uint32_t>(f_.params.size()) - kw.firstParam;
  keywords_.push_back(kw);
}

void Parser::Param() {
  SkfParam prm{};
  prm.file = &f_;
  prm.rawOff = static_cast<std::uint32_t>(p_);
  const char c = d_[p_];
  if (c == '"') {
    StringParam(prm);
  } else if (c == '<') {
    FilenameParam(prm);
  } else if (Is(c, kTokenChar)) {
    TokenParam(prm);
  } else {
    FailFound(p_, "a parameter");
  }
  prm.rawLen = static_cast<std::uint32_t>(p_) - prm.rawOff;
  f_.params.push_back(prm);
}

void Parser::StringParam(SkfParam& prm) {
  const std::size_t open = p_++;
  bool escapes = false;
  for (;;) {
    if (p_ >= n_ || d_[p_] == '\n') Fail(open, "unterminated string");
    const auto b = static_cast<unsigned char>(d_[p_]);
    if (b == '"') break;
    if (b == '\\') {
      if (p_ + 1 < n_ && (d_[p_ + 1] == '"' || d_[p_ + 1] == '\\')) {
        escapes = true;
        p_ += 2;
      } else {
        ++p_;  // any other backslash is text ("C:\runs\a")
      }
    } else if (b == 0) {
      CheckLineLength(p_);
      Fail(p_, "NUL byte in file");
    } else if (b >= 0x80) {
      const std::size_t len =
          Utf8Sequence(reinterpret_cast<const unsigned char*>(d_ + p_), n_ - p_);
      if (len == 0) {
        CheckLineLength(p_);
        Fail(p_, "invalid UTF-8 in a string");
      }
      p_ += len;
    } else {
      ++p_;
    }
  }
  const std::size_t close = p_++;
  prm.type = SkfParamType::String;
  if (!escapes) {
    prm.value.s = {static_cast<std::uint32_t>(open + 1), static_cast<std::uint32_t>(close - open - 1)};
    return;
  }
  std::string& u = f_.unescaped;
  const auto start = u.size();
  for (std::size_t q = open + 1; q < close; ++q) {
    if (d_[q] == '\\' && (d_[q + 1] == '"' || d_[q + 1] == '\\')) ++q;
    u += d_[q];
  }
  if (u.size() > kMaxFileBytes) Fail(open, "string texts larger than 2 GiB in all");
  prm.unescaped = true;
  prm.value.s = {static_cast<std::uint32_t>(start), static_cast<std::uint32_t>(u.size() - start)};
}

void Parser::FilenameParam(SkfParam& prm) {
  const std::size_t open = p_++;
  for (;;) {
    if (p_ >= n_ || d_[p_] == '\n') Fail(open, "unterminated file name");
    const auto b = static_cast<unsigned char>(d_[p_]);
    if (b == '>') break;
    if (b == 0) {
      CheckLineLength(p_);
      Fail(p_, "NUL byte in file");
    }
    if (b >= 0x80) {
      const std::size_t len =
          Utf8Sequence(reinterpret_cast<const unsigned char*>(d_ + p_), n_ - p_);
      if (len == 0) {
        CheckLineLength(p_);
        Fail(p_, "invalid UTF-8 in a file name");
      }
      p_ += len;
    } else {
      ++p_;
    }
  }
  if (p_ == open + 1) Fail(open, "empty file name <>");
  prm.type = SkfParamType::Filename;
  prm.value.s = {static_cast<std::uint32_t>(open + 1), static_cast<std::uint32_t>(p_ - open - 1)};
  ++p_;
}

void Parser::TokenParam(SkfParam& prm) {
  const std::size_t start = p_;
  while (p_ < n_ && Is(d_[p_], kTokenChar)) ++p_;
  const std::string_view tok(d_ + start, p_ - start);
  if (tok == "true" || tok == "false") {
    prm.type = SkfParamType::Bool;
    prm.value.i = tok[0] == 't' ? 1 : 0;
    return;
  }
  if (Is(tok[0], kNameStart))
    Fail(start, "invalid parameter " + Quote(tok) +
                    ": expected a number, true, false, a \"string\" or a <file name>");
  // sign? (digits ('.' digits*)? | '.' digits) (('e' | 'E') sign? digits)?
  std::size_t i = 0;
  if (tok[i] == '+' || tok[i] == '-') ++i;
  const std::size_t bodyStart = i;
  std::size_t digits = 0;
  for (; i < tok.size() && tok[i] >= '0' && tok[i] <= '9'; ++i) ++digits;
  bool isDouble = false;
  if (i < tok.size() && tok[i] == '.') {
    isDouble = true;
    ++i;
    for (; i < tok.size() && tok[i] >= '0' && tok[i] <= '9'; ++i) ++digits;
  }
  bool valid = digits > 0;
  if (valid && i < tok.size() && (tok[i] == 'e' || tok[i] == 'E')) {
    isDouble = true;
    ++i;
    if (i < tok.size() && (tok[i] == '+' || tok[i] == '-')) ++i;
    std::size_t expDigits = 0;
    for (; i < tok.size() && tok[i] >= '0' && tok[i] <= '9'; ++i) ++expDigits;
    valid = expDigits > 0;
  }
  if (!valid || i != tok.size()) Fail(start, "invalid number " + Quote(tok));
  // from_chars takes a leading '-' but not '+'.
  const char* first = tok[0] == '+' ? tok.data() + bodyStart : tok.data();
  const char* last = tok.data() + tok.size();
  if (!isDouble) {
    std::int32_t v = 0;
    const auto r = std::from_chars(first, last, v);
    if (r.ec == std::errc::result_out_of_range)
      Fail(start, "integer " + Clip(tok) + " is outside the 32-bit range");
    if (r.ec != std::errc() || r.ptr != last) Fail(start, "invalid number " + Quote(tok));
    prm.type = SkfParamType::Int;
    prm.value.i = v;
    return;
  }
  double v = 0;
  const auto r = std::from_chars(first, last, v);
  if (r.ec == std::errc::result_out_of_range) {
    // Overflow and underflow (below the subnormals) both land here; underflow reads as zero.
    if (DecimalMagnitude(tok.substr(bodyStart)) > 0)
      Fail(start, "number " + Quote(tok) + " is outside the range of a double");
    v = tok[0] == '-' ? -0.0 : 0.0;
  } else if (r.ec != std::errc() || r.ptr != last) {
    Fail(start, "invalid number " + Quote(tok));
  }
  prm.type = SkfParamType::Double;
  prm.value.d = v;
}

// Orders the local positions 0..n-1 by (name, position), records the index in f.sorted and sets
// the instance numbers. Few children: instance numbers by direct comparison, no index.
template <class NameAt, class SetInstance>
std::uint32_t NumberChildren(SkfFile& f, std::uint32_t n, NameAt nameAt, SetInstance setInstance) {
  if (n <= kIndexThreshold) {
    for (std::uint32_t i = 0; i < n; ++i) {
      std::uint32_t k = 1;
      const std::string_view name = nameAt(i);
      for (std::uint32_t j = 0; j < i; ++j)
        if (nameAt(j) == name) ++k;
      setInstance(i, k);
    }
    return kNone;
  }
  const auto off = static_cast<std::uint32_t>(f.sorted.size());
  for (std::uint32_t i = 0; i < n; ++i) f.sorted.push_back(i);
  const auto first = f.sorted.begin() + off;
  std::sort(first, f.sorted.end(), [&](std::uint32_t a, std::uint32_t b) {
    const int c = nameAt(a).compare(nameAt(b));
    return c < 0 || (c == 0 && a < b);
  });
  std::uint32_t k = 0;
  for (std::uint32_t i = 0; i < n; ++i) {
    const std::uint32_t cur = f.sorted[off + i];
    k = (i > 0 && nameAt(f.sorted[off + i - 1]) == nameAt(cur)) ? k + 1 : 1;
    setInstance(cur, k);
  }
  return off;
}

void Parser::Finish() {
  const auto nb = static_cast<std::uint32_t>(blocks_.size());
  const auto nk = static_cast<std::uint32_t>(keywords_.size());
  std::vector<std::uint32_t> cursor(static_cast<std::size_t>(nb) + 1, 0);

  // Sections grouped by parent (blocks are in file order, so each group is too).
  std::size_t numTargets = 0;
  for (const TmpBlock& b : blocks_) {
    if (b.parent == kNone) ++numTargets;
    else ++cursor[b.parent + 1];
  }
  for (std::uint32_t i = 0; i < nb; ++i) cursor[i + 1] += cursor[i];
  f_.blocks.resize(nb);
  f_.targets.reserve(numTargets);
  f_.sections.resize(nb - numTargets);
  for (std::uint32_t i = 0; i < nb; ++i) {
    const TmpBlock& t = blocks_[i];
    SkfBlock& b = f_.blocks[i];
    b = SkfBlock{&f_, nullptr, t.nameOff, t.nameLen, t.level, 1, cursor[i], 0, 0, 0, kNone, kNone, false};
    if (t.parent == kNone) {
      f_.targets.push_back(i);
    } else {
      b.parent = &f_.blocks[t.parent];
      f_.sections[b.parent->firstSection + b.parent->numSections++] = i;
    }
  }
  std::vector<TmpBlock>().swap(blocks_);

  // Keywords grouped by block.
  std::fill(cursor.begin(), cursor.end(), 0);
  for (const TmpKeyword& k : keywords_) ++cursor[k.block + 1];
  for (std::uint32_t i = 0; i < nb; ++i) cursor[i + 1] += cursor[i];
  for (std::uint32_t i = 0; i < nb; ++i) f_.blocks[i].firstKeyword = cursor[i];
  f_.keywords.resize(nk);
  for (const TmpKeyword& t : keywords_) {
    SkfBlock& b = f_.blocks[t.block];
    f_.keywords[b.firstKeyword + b.numKeywords++] =
        SkfKeyword{&b, t.nameOff, t.nameLen, t.firstParam, t.numParams, 1, false};
  }
  std::vector<TmpKeyword>().swap(keywords_);
  std::vector<std::uint32_t>().swap(cursor);
  f_.params.shrink_to_fit();
  f_.lineStarts.shrink_to_fit();
  f_.unescaped.shrink_to_fit();

  // Instance numbers and name indices.
  SkfFile& f = f_;
  f_.targetIndex = NumberChildren(
      f, static_cast<std::uint32_t>(f.targets.size()),
      [&f](std::uint32_t i) { const SkfBlock& b = f.blocks[f.targets[i]]; return f.str(b.nameOff, b.nameLen); },
      [&f](std::uint32_t i, std::uint32_t k) { f.blocks[f.targets[i]].instance = k; });
  for (SkfBlock& b : f_.blocks) {
    const std::uint32_t* sec = f.sections.data() + b.firstSection;
    b.sectionIndex = NumberChildren(
        f, b.numSections,
        [&f, sec](std::uint32_t i) { const SkfBlock& c = f.blocks[sec[i]]; return f.str(c.nameOff, c.nameLen); },
        [&f, sec](std::uint32_t i, std::uint32_t k) { f.blocks[sec[i]].instance = k; });
    SkfKeyword* kw = f.keywords.data() + b.firstKeyword;
    b.keywordIndex = NumberChildren(
        f, b.numKeywords,
        [&f, kw](std::uint32_t i) { return f.str(kw[i].nameOff, kw[i].nameLen); },
        [kw](std::uint32_t i, std::uint32_t k) { kw[i].instance = k; });
  }
  f_.sorted.shrink_to_fit();
}

// Finds the instance-th child named `name` among n children; returns its local position or kNone.
template <class NameAt>
std::uint32_t FindChild(const SkfFile& f, std::uint32_t n, std::uint32_t index, const char* name,
                        int instance, NameAt nameAt) {
  if (name == nullptr || instance < 1 || static_cast<std::uint32_t>(instance) > n) return kNone;
  const std::string_view want(name);
  if (index == kNone) {
    int k = 0;
    for (std::uint32_t i = 0; i < n; ++i)
      if (nameAt(i) == want && ++k == instance) return i;
    return kNone;
  }
  const std::uint32_t* s = f.sorted.data() + index;
  const std::uint32_t* it = std::lower_bound(
      s, s + n, want, [&](std::uint32_t a, std::string_view w) { return nameAt(a) < w; });
  const auto pos = static_cast<std::size_t>(it - s) + static_cast<std::size_t>(instance - 1);
  if (pos < n && nameAt(s[pos]) == want) return s[pos];
  return kNone;
}

std::string FolderOf(const std::string& name) {
  const auto slash = name.rfind('/');
  if (slash == std::string::npos) return "";
  if (slash == 0) return "/";
  return name.substr(0, slash);
}

// Parses f.text; on a syntax error the tree is emptied and the error recorded.
SkfFile* ParseInto(std::unique_ptr<SkfFile> f) {
  try {
    Parser parser(*f);
    try {
      if (f->textSize > kMaxFileBytes)
        throw SyntaxFault{0, "file larger than " + std::to_string(kMaxFileBytes) + " bytes"};
      parser.Run();
    } catch (SyntaxFault& e) {
      if (f->lineStarts.empty()) f->lineStarts.push_back(0);
      const auto pos = static_cast<std::uint32_t>(std::min(e.pos, f->textSize));
      f->failed = true;
      f->errLine = f->lineOf(pos);
      f->errColumn = f->columnOf(pos);
      f->errMessage = "Syntax error: " + e.message;
      // Whatever goes wrong beyond the length limit of a line is reported as the long line.
      if (f->errColumn > static_cast<int>(kSkfMaxLineBytes)) {
        f->errColumn = static_cast<int>(kSkfMaxLineBytes) + 1;
        f->errMessage =
            "Syntax error: line longer than " + std::to_string(kSkfMaxLineBytes) + " bytes";
      }
      std::vector<std::uint32_t>().swap(f->lineStarts);
      f->text.reset();
      f->textSize = 0;
      std::string().swap(f->unescaped);
      std::vector<SkfParam>().swap(f->params);
      g_error = SKF_ERR_SYNTAX;
      return f.release();
    }
    parser.Finish();
  } catch (const std::bad_alloc&) {
    g_error = SKF_ERR_MEMORY;
    return nullptr;
  }
  g_error = SKF_OK;
  return f.release();
}

bool ReadAll(int fd, std::size_t hint, std::unique_ptr<char[]>& buf, std::size_t& size) {
  std::size_t cap = hint > 0 ? hint : 65536;
  buf.reset(new char[cap]);
  size = 0;
  for (;;) {
    if (size == cap) {
      if (hint > 0) {  // a regular file that has grown since fstat: probe for more
        char probe;
        const ssize_t r = ::read(fd, &probe, 1);
        if (r == 0) return true;
        if (r < 0) {
          if (errno == EINTR) continue;
          return false;
        }
        hint = 0;
        std::unique_ptr<char[]> bigger(new char[cap * 2]);
        std::memcpy(bigger.get(), buf.get(), size);
        bigger[size++] = probe;
        buf = std::move(bigger);
        cap *= 2;
        continue;
      }
      std::unique_ptr<char[]> bigger(new char[cap * 2]);
      std::memcpy(bigger.get(), buf.get(), size);
      buf = std::move(bigger);
      cap *= 2;
    }
    const ssize_t r = ::read(fd, buf.get() + size, cap - size);
    if (r == 0) return true;
    if (r < 0) {
      if (errno == EINTR) continue;
      return false;
    }
    size += static_cast<std::size_t>(r);
  }
}

inline bool HandleOk(const void* h) {
  if (h != nullptr) return true;
  g_error = SKF_ERR_HANDLE;
  return false;
}

inline bool TypeIs(const SkfParam* p, SkfParamType t) {
  if (!HandleOk(p)) return false;
  return p->type == t;
}

std::string_view TextOf(const SkfParam* p) {
  const SkfFile& f = *p->file;
  if (p->unescaped) return std::string_view(f.unescaped).substr(p->value.s.off, p->value.s.len);
  return f.str(p->value.s.off, p->value.s.len);
}

}  // namespace

// --- loading ---------------------------------------------------------------------------------

SkfFile* skfLoadFile(const char* name, int /*flag*/) {
  if (name == nullptr) {
    g_error = SKF_ERR_OPEN;
    return nullptr;
  }
  std::unique_ptr<SkfFile> f;
  try {
    f = std::make_unique<SkfFile>();
    f->name = name;
    f->folder = FolderOf(f->name);
  } catch (const std::bad_alloc&) {
    g_error = SKF_ERR_MEMORY;
    return nullptr;
  }
  int fd;
  do fd = ::open(name, O_RDONLY | O_CLOEXEC);
  while (fd < 0 && errno == EINTR);
  if (fd < 0) {
    g_error = SKF_ERR_OPEN;
    return nullptr;
  }
  struct stat st {};
  if (::fstat(fd, &st) != 0 || S_ISDIR(st.st_mode)) {
    ::close(fd);
    g_error = SKF_ERR_OPEN;
    return nullptr;
  }
  const std::size_t hint = S_ISREG(st.st_mode) ? static_cast<std::size_t>(st.st_size) : 0;
  bool ok;
  try {
    ok = ReadAll(fd, hint, f->text, f->textSize);
  } catch (const std::bad_alloc&) {
    ::close(fd);
    g_error = SKF_ERR_MEMORY;
    return nullptr;
  }
  ::close(fd);
  if (!ok) {
    g_error = SKF_ERR_OPEN;
    return nullptr;
  }
  return ParseInto(std::move(f));
}

SkfFile* skfLoadBuffer(const char* data, std::size_t size, const char* name) {
  if (data == nullptr && size > 0) {
    g_error = SKF_ERR_HANDLE;
    return nullptr;
  }
  std::unique_ptr<SkfFile> f;
  try {
    f = std::make_unique<SkfFile>();
    f->name = name != nullptr ? name : "";
    f->folder = FolderOf(f->name);
    f->text.reset(new char[size > 0 ? size : 1]);
    if (size > 0) std::memcpy(f->text.get(), data, size);
    f->textSize = size;
  } catch (const std::bad_alloc&) {
    g_error = SKF_ERR_MEMORY;
    return nullptr;
  }
  return ParseInto(std::move(f));
}

void skfClose(SkfFile* file) { delete file; }

bool skfGetSyntaxErr(const SkfFile* file, int* line, int* column, std::string* message) {
  if (line != nullptr) *line = 0;
  if (column != nullptr) *column = 0;
  if (message != nullptr) message->clear();
  if (!HandleOk(file) || !file->failed) return false;
  if (line != nullptr) *line = file->errLine;
  if (column != nullptr) *column = file->errColumn;
  if (message != nullptr) *message = file->errMessage;
  return true;
}

std::string skfGetFileName(const SkfFile* file) {
  if (!HandleOk(file)) return "";
  return file->name;
}

// --- navigation ------------------------------------------------------------------------------

int skfGetNoTargets(const SkfFile* file) {
  if (!HandleOk(file)) return 0;
  return static_cast<int>(file->targets.size());
}

SkfBlock* skfTargetByNum(const SkfFile* file, int number) {
  if (!HandleOk(file)) return nullptr;
  if (number < 1 || static_cast<std::size_t>(number) > file->targets.size()) return nullptr;
  return const_cast<SkfBlock*>(&file->blocks[file->targets[static_cast<std::size_t>(number - 1)]]);
}

SkfBlock* skfTargetByNameNum(const SkfFile* file, const char* name, int instance) {
  if (!HandleOk(file)) return nullptr;
  const SkfFile& f = *file;
  const std::uint32_t i = FindChild(
      f, static_cast<std::uint32_t>(f.targets.size()), f.targetIndex, name, instance,
      [&f](std::uint32_t k) { const SkfBlock& b = f.blocks[f.targets[k]]; return f.str(b.nameOff, b.nameLen); });
  return i == kNone ? nullptr : const_cast<SkfBlock*>(&f.blocks[f.targets[i]]);
}

int skfGetNoSections(const SkfBlock* parent) {
  if (!HandleOk(parent)) return 0;
  return static_cast<int>(parent->numSections);
}

SkfBlock* skfSectionByNum(const SkfBlock* parent, int number) {
  if (!HandleOk(parent)) return nullptr;
  if (number < 1 || static_cast<std::uint32_t>(number) > parent->numSections) return nullptr;
  const SkfFile& f = *parent->file;
  return const_cast<SkfBlock*>(&f.blocks[f.sections[parent->firstSection + static_cast<std::uint32_t>(number - 1)]]);
}

SkfBlock* skfSectionByNameNum(const SkfBlock* parent, const char* name, int instance) {
  if (!HandleOk(parent)) return nullptr;
  const SkfFile& f = *parent->file;
  const std::uint32_t* sec = f.sections.data() + parent->firstSection;
  const std::uint32_t i = FindChild(
      f, parent->numSections, parent->sectionIndex, name, instance,
      [&f, sec](std::uint32_t k) { const SkfBlock& b = f.blocks[sec[k]]; return f.str(b.nameOff, b.nameLen); });
  return i == kNone ? nullptr : const_cast<SkfBlock*>(&f.blocks[sec[i]]);
}

SkfBlock* skfGetParent(const SkfBlock* block) {
  if (!HandleOk(block)) return nullptr;
  return block->parent;
}

int skfGetNoKeywords(const SkfBlock* block) {
  if (!HandleOk(block)) return 0;
  return static_cast<int>(block->numKeywords);
}

SkfKeyword* skfKeywordByNum(const SkfBlock* block, int number) {
  if (!HandleOk(block)) return nullptr;
  if (number < 1 || static_cast<std::uint32_t>(number) > block->numKeywords) return nullptr;
  return &block->file->keywords[block->firstKeyword + static_cast<std::uint32_t>(number - 1)];
}

SkfKeyword* skfKeywordByNameNum(const SkfBlock* block, const char* name, int instance) {
  if (!HandleOk(block)) return nullptr;
  const SkfFile& f = *block->file;
  SkfKeyword* kw = block->file->keywords.data() + block->firstKeyword;
  const std::uint32_t i =
      FindChild(f, block->numKeywords, block->keywordIndex, name, instance,
                [&f, kw](std::uint32_t k) { return f.str(kw[k].nameOff, kw[k].nameLen); });
  return i == kNone ? nullptr : kw + i;
}

int skfGetNoParams(const SkfKeyword* keyword) {
  if (!HandleOk(keyword)) return 0;
  return static_cast<int>(keyword->numParams);
}

SkfParam* skfParamByNum(const SkfKeyword* keyword, int number) {
  if (!HandleOk(keyword)) return nullptr;
  if (number < 1 || static_cast<std::uint32_t>(number) > keyword->numParams) return nullptr;
  return &keyword->block->file->params[keyword->firstParam + static_cast<std::uint32_t>(number - 1)];
}

// --- names, positions and bookkeeping --------------------------------------------------------

std::string skfGetName(const SkfBlock* block) {
  if (!HandleOk(block)) return "";
  return std::string(block->file->str(block->nameOff, block->nameLen));
}

std::string skfGetNameGlb(const SkfBlock* block) {
  if (!HandleOk(block)) return "";
  std::vector<const SkfBlock*> chain;
  std::size_t len = 0;
  for (const SkfBlock* b = block; b != nullptr; b = b->parent) {
    chain.push_back(b);
    len += b->nameLen + 1;
  }
  std::string path;
  path.reserve(len);
  for (auto it = chain.rbegin(); it != chain.rend(); ++it) {
    if (!path.empty()) path += '.';
    path.append(block->file->str((*it)->nameOff, (*it)->nameLen));
  }
  return path;
}

int skfGetLevel(const SkfBlock* block) {
  if (!HandleOk(block)) return 0;
  return static_cast<int>(block->level);
}

int skfGetInstance(const SkfBlock* block) {
  if (!HandleOk(block)) return 0;
  return static_cast<int>(block->instance);
}

int skfGetLine(const SkfBlock* block) {
  if (!HandleOk(block)) return 0;
  return block->file->lineOf(block->nameOff);
}

std::string skfGetKeywordName(const SkfKeyword* keyword) {
  if (!HandleOk(keyword)) return "";
  return std::string(keyword->block->file->str(keyword->nameOff, keyword->nameLen));
}

int skfGetKeywordLine(const SkfKeyword* keyword) {
  if (!HandleOk(keyword)) return 0;
  return keyword->block->file->lineOf(keyword->nameOff);
}

int skfGetKeywordInstance(const SkfKeyword* keyword) {
  if (!HandleOk(keyword)) return 0;
  return static_cast<int>(keyword->instance);
}

SkfBlock* skfGetKeywordBlock(const SkfKeyword* keyword) {
  if (!HandleOk(keyword)) return nullptr;
  return keyword->block;
}

void skfMarkRead(SkfBlock* block) {
  if (block != nullptr) block->read = true;
}

void skfMarkRead(SkfKeyword* keyword) {
  if (keyword != nullptr) keyword->read = true;
}

bool skfIsRead(const SkfBlock* block) {
  if (!HandleOk(block)) return false;
  return block->read;
}

bool skfIsRead(const SkfKeyword* keyword) {
  if (!HandleOk(keyword)) return false;
  return keyword->read;
}

// --- parameters ------------------------------------------------------------------------------

SkfParamType skfGetParamType(const SkfParam* param) {
  if (!HandleOk(param)) return SkfParamType::Int;
  return param->type;
}

int skfGetParamLine(const SkfParam* param) {
  if (!HandleOk(param)) return 0;
  return param->file->lineOf(param->rawOff);
}

int skfGetParamColumn(const SkfParam* param) {
  if (!HandleOk(param)) return 0;
  return param->file->columnOf(param->rawOff);
}

bool skfIsInt(const SkfParam* param) { return TypeIs(param, SkfParamType::Int); }
bool skfIsDouble(const SkfParam* param) { return TypeIs(param, SkfParamType::Double); }
bool skfIsBool(const SkfParam* param) { return TypeIs(param, SkfParamType::Bool); }
bool skfIsString(const SkfParam* param) { return TypeIs(param, SkfParamType::String); }
bool skfIsFilename(const SkfParam* param) { return TypeIs(param, SkfParamType::Filename); }

std::int32_t skfGetInt(const SkfParam* param) {
  if (!HandleOk(param)) return 0;
  if (param->type != SkfParamType::Int) {
    g_error = SKF_ERR_TYPE;
    return 0;
  }
  return param->value.i;
}

double skfGetDouble(const SkfParam* param) {
  if (!HandleOk(param)) return 0.0;
  if (param->type == SkfParamType::Int) return static_cast<double>(param->value.i);
  if (param->type == SkfParamType::Double) return param->value.d;
  g_error = SKF_ERR_TYPE;
  return 0.0;
}

float skfGetFloat(const SkfParam* param) {
  if (!HandleOk(param)) return 0.0f;
  if (param->type == SkfParamType::Int) return static_cast<float>(param->value.i);
  if (param->type != SkfParamType::Double) {
    g_error = SKF_ERR_TYPE;
    return 0.0f;
  }
  const double d = param->value.d;
  if (std::isfinite(d) && std::fabs(d) > static_cast<double>(FLT_MAX)) {
    g_error = SKF_ERR_RANGE;
    return 0.0f;
  }
  return static_cast<float>(d);
}

bool skfGetBool(const SkfParam* param) {
  if (!HandleOk(param)) return false;
  if (param->type != SkfParamType::Bool) {
    g_error = SKF_ERR_TYPE;
    return false;
  }
  return param->value.i != 0;
}

std::string skfGetString(const SkfParam* param) {
  if (!HandleOk(param)) return "";
  if (param->type != SkfParamType::String) {
    g_error = SKF_ERR_TYPE;
    return "";
  }
  return std::string(TextOf(param));
}

std::string skfGetFilename(const SkfParam* param) {
  if (!HandleOk(param)) return "";
  if (param->type != SkfParamType::String && param->type != SkfParamType::Filename) {
    g_error = SKF_ERR_TYPE;
    return "";
  }
  return skfResolvePath(param->file->folder, TextOf(param));
}

std::string skfGetResultFilenamePath(const SkfParam* param) { return skfGetFilename(param); }

std::string skfGetParamText(const SkfParam* param) {
  if (!HandleOk(param)) return "";
  return std::string(param->file->str(param->rawOff, param->rawLen));
}

// --- pending error ---------------------------------------------------------------------------

int skfPeekErrorGlb() { return g_error; }
void skfClearErrorGlb() { g_error = SKF_OK; }

std::string skfResolvePath(std::string_view folder, std::string_view name) {
  if (name.empty()) return "";
  if (name.front() == '/' || folder.empty() || folder == ".") return std::string(name);
  while (name.size() > 2 && name.substr(0, 2) == "./") {
    name.remove_prefix(2);
    while (name.size() > 1 && name.front() == '/') name.remove_prefix(1);
  }
  std::string path(folder);
  if (path.back() != '/') path += '/';
  path.append(name);
  return path;
}
