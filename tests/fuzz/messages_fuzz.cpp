// Any bytes as a message file: no crash, the same state whatever pieces they come in, and a screen that fits.

#include <cstdint>
#include <string_view>

#include "require.h"
#include "viewer/progress_records.h"
#include "viewer/screen_layout.h"

namespace {

void requireFit(const mirevo::ProgressState& state, mirevo::ScreenSize size, mirevo::CharacterSet characters) {
  mirevo::ViewerSituation situation;
  situation.presence = state.ending.empty() ? mirevo::RunPresence::running : mirevo::RunPresence::ended;
  situation.now = 1.8e9;
  const auto lines = mirevo::layoutScreen(state, situation, size, characters);
  require(lines.size() == static_cast<std::size_t>(size.rows));
  for (const mirevo::ScreenLine& line : lines) {
    require(mirevo::displayWidth(line.text) <= size.columns);
    for (const char c : line.text) require(static_cast<unsigned char>(c) >= 0x20 && c != 0x7F);
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  if (size < 3) return 0;
  const std::size_t piece = data[0] + 1U;
  const mirevo::ScreenSize screen{data[1] + 1, data[2] % 64 + 1};
  const std::string_view bytes(reinterpret_cast<const char*>(data) + 3, size - 3);
  mirevo::ProgressRecords whole;
  whole.feed(bytes, 1.8e9);
  mirevo::ProgressRecords pieces;
  for (std::size_t i = 0; i < bytes.size(); i += piece) pieces.feed(bytes.substr(i, piece), 1.8e9);
  const mirevo::ProgressState& state = whole.state();
  require(state.done == pieces.state().done && state.failed == pieces.state().failed && state.failed <= state.done);
  require(state.notices == pieces.state().notices && state.latestMessage == pieces.state().latestMessage);
  require(state.course.size() == pieces.state().course.size());
  requireFit(state, screen, mirevo::CharacterSet::utf8);
  requireFit(state, screen, mirevo::CharacterSet::ascii);
  return 0;
}
