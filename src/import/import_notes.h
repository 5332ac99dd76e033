#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

/// What became of something in the source that has no exact counterpart.
enum class NoteKind {
  toCheck,       ///< taken in a way that may not be what was meant, or that may not work here
  expressed,     ///< has another form here
  noCounterpart  ///< left out
};

/// A place in a file of the source; line 0 is the file as a whole.
struct SourcePlace {
  std::string file;
  std::size_t line = 0;

  /// "case.pst:12".
  std::string text() const;
};

struct ImportNote {
  NoteKind kind = NoteKind::noCounterpart;
  SourcePlace place;
  std::size_t lastLine = 0;  ///< of several lines that the note is about
  std::string text;
};

/// The account of an import: everything in the source that is not simply in the setup.
class ImportNotes final {
 public:
  void add(NoteKind kind, SourcePlace place, std::string_view text);
  /// As the note before it, if that says the same of the line before: one for all of these lines.
  void addForEach(NoteKind kind, const SourcePlace& place, const std::string& text);

  const std::vector<ImportNote>& all() const { return notes_; }
  std::size_t count(NoteKind kind) const;
  /// The notes in groups, one a line, each group by place.
  std::string text() const;

 private:
  std::vector<ImportNote> notes_;
};

/// Throws FatalError: "Error: Unable to import case.pst" with the place, what was expected and what is to be done.
[[noreturn]] void failImport(const SourcePlace& place, std::string_view explanation);

}  // namespace mirevo
