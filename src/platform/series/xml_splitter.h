#pragma once

#include <cstddef>
#include <functional>
#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

/// Parts a long XML document into what describes its series and their points (time and value), so that no part needs
/// to be in memory whole. Follows the tags and checks that they match; what is in them is for a real parser. Comments,
/// processing instructions and prefixes of names are passed over; a document type is refused.
class XmlSplitter final {
 public:
  /// Which elements are points: those with this name directly within a container. Names without prefix; none: the root
  /// is not one of a format that is known.
  struct Names {
    std::string_view container;
    std::string_view point;
  };
  using OnRoot = std::function<Names(std::string_view root)>;
  /// Whole points of the container with this number, counted from 0, from the line on; false to end.
  using OnPoints = std::function<bool(std::size_t container, const std::string& points, std::size_t line)>;

  XmlSplitter(OnRoot onRoot, OnPoints onPoints) : onRoot_(std::move(onRoot)), onPoints_(std::move(onPoints)) {}

  /// The next bytes of the document. False when there is a fault in them, or OnPoints has ended it.
  bool take(std::string_view bytes);
  /// After the last: whether the document was complete.
  bool finish();

  /// All but the points, with every container in its place.
  const std::string& outline() const { return outline_; }
  std::size_t line() const { return line_; }
  /// "expected </series>, found the end of the file"; empty if OnPoints has ended it.
  const std::string& fault() const { return fault_; }

 private:
  bool takeText(std::string_view text);
  bool takeTag();
  bool takeStart(std::string_view tag);
  bool takeEnd(std::string_view tag);
  void closePoint();
  bool handOver();
  bool refuse(std::string fault);
  bool isInPoint() const { return pointDepth_ != 0; }
  std::string& target() { return isInPoint() ? points_ : outline_; }

  OnRoot onRoot_;
  OnPoints onPoints_;
  Names names_;
  std::string outline_;
  std::string points_;
  std::size_t pointsLine_ = 1;  ///< on which they begin
  std::size_t pointsEnd_ = 1;   ///< on which the last of them ends
  std::string tag_;             ///< from its "<" on, while inside of one
  char quote_ = 0;              ///< that began an attribute's value in the tag
  bool isEnded_ = false;        ///< the root
  std::size_t pointDepth_ = 0;  ///< of the point that is open; 0: none
  std::size_t containers_ = 0;
  std::vector<std::string> open_;
  std::size_t line_ = 1;
  std::string fault_;
};

/// A name without its prefix: "value" of "wml2:value".
inline std::string_view localName(std::string_view name) {
  return name.substr(name.find(':') + 1);
}

}  // namespace mirevo
