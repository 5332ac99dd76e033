#include "platform/processes/batch_file_hints.h"

#include <algorithm>
#include <array>
#include <fcntl.h>
#include <string_view>
#include <unistd.h>

#include <fmt/core.h>

#include "common/files.h"
#include "common/text.h"

namespace mirevo {

std::string interpreterHint(const std::string& file) {
  std::array<char, 256> head{};
  const int fd = ::open(file.c_str(), O_RDONLY | O_CLOEXEC);
  if (fd < 0) return {};
  const ssize_t length = ::read(fd, head.data(), head.size());
  ::close(fd);
  const std::string_view text(head.data(), static_cast<std::size_t>(std::max<ssize_t>(length, 0)));
  if (!text.starts_with("#!")) return {};
  const std::string_view line = text.substr(2, text.find('\n') == std::string_view::npos ? 254 : text.find('\n') - 2);
  if (line.ends_with('\r')) {
    return fmt::format("; its first line asks for \"{}\" and ends in a carriage return: save it with LF line ends",
                       trim(line));
  }
  return fmt::format("; its first line asks for \"{}\"", trim(line));
}

std::string meaningOfCode(int status, const std::string& file) {
  if (status != 126 && status != 127) return {};
  std::string text = status == 127 ? " (a shell: command not found" : " (a shell: command not executable";
  std::string ignored;
  const std::string head = readFileHead(file, ignored).value_or("");
  if (head.find("\r\n") != std::string::npos) {
    text +=
        "; the lines of the file end in CR LF, of which a shell takes CR for part of a word: save it with LF line ends";
  } else {
    text += status == 127 ? "; the batch runs in the copy of its folder: name a program relative to that, or with its "
                            "whole path"
                          : "; a program needs chmod +x in the model's folder";
  }
  return text + ")";
}

}  // namespace mirevo
