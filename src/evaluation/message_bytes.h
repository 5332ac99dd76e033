#pragma once

#include <cstdint>
#include <cstring>
#include <exception>
#include <optional>
#include <string>
#include <string_view>
#include <type_traits>
#include <utility>
#include <vector>

namespace mirevo {

/// The content of a message is not what it should be.
class BadMessage final : public std::exception {
 public:
  const char* what() const noexcept override { return "a message has another form than expected"; }
};

/// The fields of a struct, named once for both directions: a specialisation has `static void of(auto& archive, auto&
/// value)`, which calls `archive(fields...)`, a Writer or a Reader, and `archive.require(isPossible)` if values of a
/// field can be impossible. Numbers pass as their bytes, so that both sides have the same bits.
template <class Struct>
struct Layout;

template <class Value>
inline constexpr bool kIsPlain = std::is_arithmetic_v<Value> || std::is_enum_v<Value>;

template <class Value>
concept Number = std::is_arithmetic_v<Value> && !std::is_same_v<Value, bool>;

/// Turns a message into bytes, field by field.
class Writer final {
 public:
  template <class... Fields>
  void operator()(const Fields&... fields) {
    (put(fields), ...);
  }
  static void require(bool) {}  // what is written is as it should be
  std::string take() { return std::move(content_); }

 private:
  template <class Value>
  void put(const Value& value) {
    if constexpr (kIsPlain<Value>) {
      content_.append(reinterpret_cast<const char*>(&value), sizeof value);
    } else {
      Layout<Value>::of(*this, value);
    }
  }
  void put(const std::string& text) {
    put(static_cast<std::uint64_t>(text.size()));
    content_.append(text);
  }
  template <class Item>
  void put(const std::vector<Item>& items) {
    put(static_cast<std::uint64_t>(items.size()));
    for (const Item& item : items) put(item);
  }
  template <Number Value>
  void put(const std::vector<Value>& values) {
    put(static_cast<std::uint64_t>(values.size()));
    content_.append(reinterpret_cast<const char*>(values.data()), values.size() * sizeof(Value));
  }
  template <class Value>
  void put(const std::optional<Value>& value) {
    put(value.has_value());
    if (value) put(*value);
  }

  std::string content_;
};

/// Restores a message from the bytes of a Writer.
class Reader final {
 public:
  explicit Reader(std::string_view content) : rest_(content) {}
  bool isAtEnd() const { return rest_.empty(); }

  template <class... Fields>
  void operator()(Fields&... fields) {
    (get(fields), ...);
  }
  static void require(bool isPossible) {
    if (!isPossible) throw BadMessage();
  }

 private:
  template <class Value>
  void get(Value& value) {
    if constexpr (kIsPlain<Value>) {
      std::memcpy(&value, bytes(sizeof value).data(), sizeof value);
    } else {
      Layout<Value>::of(*this, value);
    }
  }
  void get(bool& value) { value = bytes(1).front() != '\0'; }
  void get(std::string& text) { text = bytes(count()); }
  template <class Item>
  void get(std::vector<Item>& items) {
    items.clear();
    for (auto left = count(); left > 0; --left) get(items.emplace_back());  // ends with the content, whatever the count
  }
  template <Number Value>
  void get(std::vector<Value>& values) {
    const auto size = count();
    require(size <= rest_.size() / sizeof(Value));
    values.resize(size);
    if (size > 0) std::memcpy(values.data(), bytes(size * sizeof(Value)).data(), size * sizeof(Value));
  }
  template <class Value>
  void get(std::optional<Value>& value) {
    bool hasValue = false;
    get(hasValue);
    value.reset();
    if (hasValue) get(value.emplace());
  }

  std::uint64_t count() {
    std::uint64_t value = 0;
    get(value);
    return value;
  }
  std::string_view bytes(std::uint64_t count) {
    require(count <= rest_.size());
    const std::string_view taken = rest_.substr(0, count);
    rest_.remove_prefix(count);
    return taken;
  }

  std::string_view rest_;
};

template <class Message>
std::string bytesOf(const Message& message) {
  Writer writer;
  Layout<Message>::of(writer, message);
  return writer.take();
}

/// Throws BadMessage for what bytesOf() cannot have made.
template <class Message>
Message messageOf(std::string_view content) {
  Reader reader(content);
  Message message;
  Layout<Message>::of(reader, message);
  reader.require(reader.isAtEnd());
  return message;
}

}  // namespace mirevo
