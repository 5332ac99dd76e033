#include "platform/series/xml_splitter.h"

#include <algorithm>
#include <utility>

#include <fmt/core.h>

#include "common/text.h"

namespace mirevo {
namespace {

constexpr std::size_t kMiB = std::size_t{1} << 20;
constexpr std::size_t kLongestTag = kMiB;
constexpr std::size_t kLongestOutline = 64 * kMiB;
constexpr std::size_t kHandedOver = kMiB;  ///< bytes of points at a time
constexpr std::size_t kDeepest = 64;

std::size_t countLines(std::string_view text) {
  return static_cast<std::size_t>(std::count(text.begin(), text.end(), '\n'));
}

std::string_view nameOf(std::string_view tag) {
  return tag.substr(0, tag.find_first_of(" \t\r\n/>"));
}

}  // namespace

bool XmlSplitter::refuse(std::string fault) {
  fault_ = std::move(fault);
  return false;
}

bool XmlSplitter::take(std::string_view bytes) {
  while (!bytes.empty()) {
    if (tag_.empty()) {
      const std::string_view text = bytes.substr(0, bytes.find('<'));
      if (!takeText(text)) return false;
      bytes.remove_prefix(text.size());
      if (bytes.empty()) return true;
    }
    const char c = bytes.front();
    bytes.remove_prefix(1);
    if (c == '\n') ++line_;
    tag_ += c;
    const bool isPlain = tag_.size() > 1 && tag_[1] != '!' && tag_[1] != '?';
    if (isPlain && (c == '"' || c == '\'') && (quote_ == 0 || quote_ == c)) quote_ = quote_ == 0 ? c : '\0';
    if (tag_.size() > kLongestTag) return refuse(fmt::format("a tag is longer than {} bytes", kLongestTag));
    if (c == '>' && quote_ == 0 && !takeTag()) return false;
  }
  return true;
}

bool XmlSplitter::takeText(std::string_view text) {
  line_ += countLines(text);
  if (open_.empty()) {
    const std::size_t other = text.find_first_not_of(" \t\r\n\xEF\xBB\xBF");
    if (other == std::string_view::npos) return true;
    return refuse(fmt::format("expected {}, found {}", isEnded_ ? "the end of the document" : "an XML document",
                              quotedForMessage(text.substr(other))));
  }
  // Blanks between the points of a long series.
  const bool isBlank = text.find_first_not_of(" \t\r\n") == std::string_view::npos;
  if (isBlank && !isInPoint() && localName(open_.back()) == names_.container) return true;
  target() += text;
  if (outline_.size() > kLongestOutline) return refuse("it has too much that is no time series");
  return points_.size() < 4 * kHandedOver || refuse("a point is too long");
}

bool XmlSplitter::takeTag() {
  const std::string_view tag = tag_;
  const bool isComment = tag.starts_with("<!--");
  const bool isText = tag.starts_with("<![CDATA[");
  if (isComment ? tag.size() < 7 || !tag.ends_with("-->") : isText && !tag.ends_with("]]>")) return true;
  if (tag.starts_with("<?") && !tag.ends_with("?>")) return true;
  if (isText) {
    if (open_.empty()) return refuse("expected an element, found text");
    target() += tag;
  } else if (isComment || tag.starts_with("<?")) {
    target().append(countLines(tag), '\n');
  } else if (tag.starts_with("<!")) {
    return refuse("expected a document without a document type (<!DOCTYPE), found one");
  } else if (!(tag.starts_with("</") ? takeEnd(tag) : takeStart(tag))) {
    return false;
  }
  tag_.clear();
  return true;
}

bool XmlSplitter::takeStart(std::string_view tag) {
  const std::string_view name = nameOf(tag.substr(1));
  if (name.empty()) return refuse(fmt::format("expected the name of an element, found {}", quotedForMessage(tag)));
  if (isEnded_) return refuse(fmt::format("expected the end of the document, found {}", quotedForMessage(tag)));
  if (open_.empty()) {
    names_ = onRoot_(localName(name));
    if (names_.container.empty()) return false;
  }
  const bool isPoint =
      !isInPoint() && !open_.empty() && localName(open_.back()) == names_.container && localName(name) == names_.point;
  if (isPoint) {
    const std::size_t line = line_ - countLines(tag);
    if (points_.empty()) pointsLine_ = pointsEnd_ = line;
    points_.append(line - pointsEnd_, '\n');
    pointDepth_ = open_.size() + 1;
  } else if (!isInPoint() && localName(name) == names_.container) {
    if (!handOver()) return false;
    ++containers_;
  }
  target() += tag;
  const bool isWhole = tag.ends_with("/>");
  if (!isWhole) open_.emplace_back(name);
  if (isWhole && isPoint) closePoint();
  if (isWhole && open_.empty()) isEnded_ = true;
  if (open_.size() > kDeepest) return refuse(fmt::format("its elements are nested deeper than {}", kDeepest));
  return points_.size() < kHandedOver || isInPoint() || handOver();
}

bool XmlSplitter::takeEnd(std::string_view tag) {
  const std::string_view name = nameOf(tag.substr(2));
  if (open_.empty() || open_.back() != name) {
    return refuse(fmt::format("expected {}, found {}", open_.empty() ? "an element" : "</" + open_.back() + ">",
                              quotedForMessage(tag)));
  }
  target() += tag;
  if (pointDepth_ == open_.size()) closePoint();
  open_.pop_back();
  isEnded_ = open_.empty();
  if (isInPoint()) return true;
  return points_.size() < kHandedOver || handOver();
}

void XmlSplitter::closePoint() {
  pointDepth_ = 0;
  pointsEnd_ = line_;
}

bool XmlSplitter::handOver() {
  if (points_.empty()) return true;
  const bool goesOn = containers_ > 0 && onPoints_(containers_ - 1, points_, pointsLine_);
  points_.clear();
  return goesOn;
}

bool XmlSplitter::finish() {
  if (!isEnded_ || !tag_.empty()) {
    return refuse(fmt::format("expected {}, found the end of the file",
                              open_.empty() ? "an XML document" : "</" + open_.back() + ">"));
  }
  return handOver();
}

}  // namespace mirevo
