#include "import/import_notes.h"

#include <algorithm>
#include <utility>

#include <fmt/format.h>

#include "common/fatal_error.h"
#include "common/text.h"

namespace mirevo {

std::string SourcePlace::text() const {
  return line == 0 ? file : fmt::format("{}:{}", file, line);
}

void ImportNotes::add(NoteKind kind, SourcePlace place, std::string_view text) {
  const std::size_t line = place.line;
  notes_.push_back({kind, std::move(place), line, onOneLine(text)});
}

void ImportNotes::addForEach(NoteKind kind, const SourcePlace& place, const std::string& text) {
  const auto isSame = [&](const ImportNote& note) {
    return note.kind == kind && note.place.file == place.file && note.lastLine + 1 == place.line && note.text == text;
  };
  const auto known = std::find_if(notes_.rbegin(), notes_.rend(), isSame);
  if (known != notes_.rend()) {
    known->lastLine = place.line;
  } else {
    add(kind, place, text);
  }
}

std::size_t ImportNotes::count(NoteKind kind) const {
  const auto isOfKind = [kind](const ImportNote& note) { return note.kind == kind; };
  return static_cast<std::size_t>(std::count_if(notes_.begin(), notes_.end(), isOfKind));
}

std::string ImportNotes::text() const {
  constexpr std::pair<NoteKind, std::string_view> kGroups[] = {
      {NoteKind::toCheck, "To be checked"},
      {NoteKind::noCounterpart, "Without a counterpart, and left out"},
      {NoteKind::expressed, "Expressed in another way"}};
  std::string text;
  for (const auto& [kind, heading] : kGroups) {
    if (count(kind) == 0) continue;
    text += fmt::format("{}{}\n", text.empty() ? "" : "\n", heading);
    std::vector<const ImportNote*> group;
    for (const ImportNote& note : notes_) {
      if (note.kind == kind) group.push_back(&note);
    }
    std::stable_sort(group.begin(), group.end(), [](const ImportNote* a, const ImportNote* b) {
      return a->place.file == b->place.file && a->place.line < b->place.line;
    });
    for (const ImportNote* note : group) {
      const std::string last = note->lastLine > note->place.line ? fmt::format("-{}", note->lastLine) : std::string();
      text += fmt::format("  {}{}: {}\n", note->place.text(), last, note->text);
    }
  }
  return text;
}

void failImport(const SourcePlace& place, std::string_view explanation) {
  fatalError("Error: Unable to import " + place.file, fmt::format("{}: {}", place.text(), explanation));
}

}  // namespace mirevo
