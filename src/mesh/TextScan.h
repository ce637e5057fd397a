// Fast scanning of text mesh files held in memory: line by line, fields separated by blanks,
// tabs or commas, numbers parsed with std::from_chars (no locale, no allocation). Every fault
// throws MeshError naming the file and the line.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "mesh/MeshData.h"

// Reads a whole file into memory. Missing files, folders and unreadable files throw
// "Unable to open file <name>" (with the system's reason).
std::string ReadWholeFile(const std::string& path);

class TextScanner {
 public:
  TextScanner(const char* data, std::size_t size, std::string name);

  // Advances to the next line that is not blank; false at the end of the text. With
  // `skipComments`, lines whose first field starts with '#' are skipped as well.
  bool NextLine(bool skipComments = false);
  // As NextLine, but the end of the text is an error: "<name>: file ends early at line N
  // (expected <what>)".
  void RequireLine(std::string_view what, bool skipComments = false);

  // Fields of the current line, left to right.
  bool AtEnd();                         // no more fields on the line
  std::string_view Field();             // next field; "" when none
  std::int64_t Int(std::string_view what);    // next field as an integer (error when missing)
  std::int32_t Int32(std::string_view what);  // and within 32-bit range
  double Double(std::string_view what);       // next field as a finite or non-finite number
  bool TryInt(std::int64_t& value);           // next field if it is an integer (else unmoved)
  bool TryDouble(double& value);
  std::string_view Rest();              // the rest of the line, blanks trimmed at both ends
  std::string_view Line() const { return line_; }

  int LineNumber() const { return lineNumber_; }
  const std::string& Name() const { return name_; }
  // Bytes left after the current line (for plausibility checks of header counts).
  std::size_t Remaining() const { return size_ - pos_; }
  // "<name>, line N: <message>"
  [[noreturn]] void Fail(std::string_view message) const;

 private:
  void SkipSeparators();
  const char* data_;
  std::size_t size_;
  std::size_t pos_ = 0;  // start of the next line
  std::string name_;
  std::string_view line_;
  std::size_t cursor_ = 0;  // position within line_
  int lineNumber_ = 0;
};

// Checks a count read from a header against the bytes left: each item needs at least
// `minBytesPerItem` bytes, so a header claiming more items than the file can hold is refused
// before anything is allocated.
void CheckCount(const TextScanner& scan, std::int64_t count, std::size_t minBytesPerItem,
                std::string_view what);
