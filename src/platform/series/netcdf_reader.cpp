#include "platform/series/netcdf_reader.h"

#include <algorithm>
#include <new>
#include <sys/stat.h>
#include <unistd.h>
#include <utility>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/reading_watch.h"
#include "platform/series/netcdf_functions.h"

namespace mirevo {
namespace {

constexpr std::size_t kLongestUnit = 400;  ///< so that names and units are no nonsense to the program

/// Followed by the path and the numbers of the items.
struct Request {
  std::uint64_t pathLength = 0;
  std::uint64_t itemCount = 0;
  double seconds = 0.0;
};

/// Followed by the text of the fault if there is one; else by the times, the names, each with a zero byte, and the
/// items that were asked for.
struct Answer {
  bool isGood = true;
  std::uint64_t textLength = 0;  ///< of the fault, or of the names
  std::int64_t startSecond = 0;
  std::uint64_t stepCount = 0;
  std::uint64_t nameCount = 0;
  std::uint64_t itemCount = 0;
};

/// Followed by the fault if it has a length, else by the values.
struct ItemAnswer {
  NetcdfUnit unit;
  std::uint64_t faultLength = 0;
};

// A series of some ten million steps in a file that compression has made small.
constexpr std::uintmax_t kLeastMemory = std::uintmax_t{2} << 30;
constexpr std::uintmax_t kMemoryPerByte = 16;

/// How much memory reading a file may take.
std::uintmax_t memoryFor(const std::string& path) {
  struct stat status {};
  const std::uintmax_t size = ::stat(path.c_str(), &status) == 0 ? static_cast<std::uintmax_t>(status.st_size) : 0;
  const auto physical =
      static_cast<std::uintmax_t>(::sysconf(_SC_PHYS_PAGES)) * static_cast<std::uintmax_t>(::sysconf(_SC_PAGESIZE));
  return std::min(kLeastMemory + kMemoryPerByte * size, std::max(kLeastMemory / 2, physical / 2));
}

/// The helper's side of a request.
class Service final {
 public:
  explicit Service(int socket) : socket_(socket) {}

  /// False when the program is gone.
  bool serve() const {
    Request request;
    if (!receiveInHelper(socket_, &request, sizeof request)) return false;
    std::string path(request.pathLength, '\0');
    std::vector<int> items(request.itemCount);
    if (!receiveInHelper(socket_, path.data(), path.size())) return false;
    if (!receiveInHelper(socket_, items.data(), items.size() * sizeof(int))) return false;
    limitOwnTime(request.seconds);
    limitOwnMemory(memoryFor(path));
    try {
      return read(path, items);
    } catch (const std::bad_alloc&) {
      return refuse(fmt::format("{}: reading it takes more than {} MB of memory, which no sound file of its size does",
                                path, memoryFor(path) / 1'000'000));
    }
  }

 private:
  /// An item that was read.
  struct Read {
    ItemAnswer head;
    std::vector<double> values;
    std::string fault;
  };

  bool read(const std::string& path, std::span<const int> items) const {
    std::vector<Read> read;
    Answer answer;
    std::string names;
    std::vector<double> times;
    {
      NetcdfTimeSeries file;
      if (!file.open(path)) return refuse(file.lastError());
      for (int item = 1; item <= file.itemCount(); ++item) {
        names += file.itemName(item) + '\0' + file.itemUnit(item).substr(0, kLongestUnit) + '\0';
      }
      for (const int item : items) {
        if (item < 1 || item > file.itemCount()) continue;
        const auto place = static_cast<std::size_t>(item - 1);
        Read& each = read.emplace_back();
        if (auto values = file.readValues(place)) {
          each.values = std::move(*values);
          each.head.unit = file.unitOf(place);
        } else {
          each.fault = file.lastError();
        }
        each.head.faultLength = each.fault.size();
      }
      if (const auto start = file.startTime()) answer.startSecond = secondNumber(*start);
      answer.nameCount = static_cast<std::uint64_t>(file.itemCount());
      times.assign(file.times().begin(), file.times().end());
    }
    answer.textLength = names.size();
    answer.stepCount = times.size();
    answer.itemCount = read.size();
    bool isSent = send(&answer, 1) && send(times.data(), times.size()) && send(names.data(), names.size());
    for (const Read& each : read) {
      isSent = isSent && send(&each.head, 1) && send(each.fault.data(), each.fault.size()) &&
               send(each.values.data(), each.values.size());
    }
    return isSent;
  }
  template <class Element>
  bool send(const Element* elements, std::size_t count) const {
    return sendFromHelper(socket_, elements, count * sizeof(Element));
  }
  bool refuse(const std::string& fault) const {
    Answer answer;
    answer.isGood = false;
    answer.textLength = fault.size();
    return send(&answer, 1) && send(fault.data(), fault.size());
  }

  int socket_;
};

void serveFiles(int socket) {
  const Service service(socket);
  while (service.serve()) {
  }
}

/// The program's side of a request. Ends the helper unless the answer was good and received to its end.
class Exchange final {
 public:
  Exchange(HelperProcess& helper, const std::string& path, ReadingWatch& watch, std::string& reason)
      : helper_(helper), path_(path), watch_(watch.hasBegun() ? watch : own_), reason_(reason) {
    own_.begin(kLongestReading, fmt::format("{:g} seconds", kLongestReading));
  }
  ~Exchange() {
    if (!isFinished_) helper_.end();
  }
  Exchange(const Exchange&) = delete;
  Exchange& operator=(const Exchange&) = delete;

  /// False, with the reason, when no good answer has come.
  bool ask(std::span<const int> items) {
    std::string why;
    // Loaded here, so that a helper that is replaced has it at once, and of the version with which the run began.
    if (netcdfFunctions(why) == nullptr) {
      reason_ = fmt::format("{}: NetCDF files cannot be read: {}", path_, why);
      return false;
    }
    if (!helper_.isRunning() && !helper_.start(serveFiles, why)) {
      reason_ = fmt::format("{}: a process that reads it could not be started: {}", path_, why);
      return false;
    }
    const Request request{path_.size(), items.size(), watch_.secondsLeft()};
    std::string bytes(reinterpret_cast<const char*>(&request), sizeof request);
    bytes += path_;
    bytes.append(reinterpret_cast<const char*>(items.data()), items.size_bytes());
    helper_.send(bytes.data(), bytes.size(), watch_);  // the answer tells of a failure
    if (!receive(&answer_, sizeof answer_)) return false;
    constexpr std::uint64_t kLongestName = 1000;
    const bool isPossible = answer_.stepCount <= kMostNetcdfSteps && answer_.nameCount <= kMostNetcdfItems &&
                            answer_.itemCount <= items.size() &&
                            answer_.textLength <= (answer_.nameCount + 100) * kLongestName;
    if (!isPossible) return failDamaged("has sent nonsense");
    if (answer_.isGood) return true;
    receiveText(reason_, answer_.textLength);
    return false;
  }
  bool receiveText(std::string& text, std::size_t length) {
    std::vector<char> characters;
    if (!receiveAll(characters, length)) return false;
    text.assign(characters.begin(), characters.end());
    return true;
  }
  const Answer& answer() const { return answer_; }
  bool receive(void* bytes, std::size_t size) {
    const HelperProcess::Outcome outcome = helper_.receive(bytes, size, watch_);
    if (outcome == HelperProcess::Outcome::done) return true;
    if (outcome == HelperProcess::Outcome::ended) return failDamaged(helper_.endAndDescribe());
    reason_ = fmt::format("{}: {}", path_, watch_.reason());
    return false;
  }
  /// In parts, so that no more memory is taken than the helper has filled.
  template <class Element>
  bool receiveAll(std::vector<Element>& elements, std::size_t count) {
    constexpr std::size_t kPart = std::size_t{1} << 20;
    while (elements.size() < count) {
      const std::size_t before = elements.size();
      elements.resize(std::min(count, before + kPart));
      if (!receive(elements.data() + before, (elements.size() - before) * sizeof(Element))) return false;
    }
    return true;
  }
  void finish() { isFinished_ = true; }

 private:
  bool failDamaged(const std::string& what) {
    reason_ = fmt::format("{}: the process that read it {}: the file seems to be damaged", path_, what);
    return false;
  }

  HelperProcess& helper_;
  const std::string& path_;
  ReadingWatch own_;  ///< where the other has not begun
  ReadingWatch& watch_;
  std::string& reason_;
  Answer answer_;
  bool isFinished_ = false;
};

}  // namespace

std::optional<NetcdfReader::Content> NetcdfReader::read(const std::string& path, std::span<const int> items,
                                                        ReadingWatch& watch, std::string& reason) {
  auto content = readOnce(path, items, watch, reason);
  // The file may be sound: whoever ends processes (the system, for their memory; an administrator) chose this one.
  if (!content && helper_.wasKilled()) content = readOnce(path, items, watch, reason);
  return content;
}

std::optional<NetcdfReader::Content> NetcdfReader::readOnce(const std::string& path, std::span<const int> items,
                                                            ReadingWatch& watch, std::string& reason) {
  Exchange exchange(helper_, path, watch, reason);
  if (!exchange.ask(items)) return std::nullopt;
  const Answer& answer = exchange.answer();
  Content content;
  std::string names;
  if (!exchange.receiveAll(content.times, answer.stepCount) || !exchange.receiveText(names, answer.textLength))
    return std::nullopt;
  for (std::size_t begin = 0; begin < names.size();) {
    const std::size_t end = names.find('\0', begin);
    std::vector<std::string>& texts = content.names.size() == content.units.size() ? content.names : content.units;
    texts.push_back(names.substr(begin, end - begin));
    begin = end == std::string::npos ? end : end + 1;
  }
  content.units.resize(content.names.size());
  for (std::uint64_t i = 0; i < answer.itemCount; ++i) {
    ItemAnswer head;
    Item& item = content.items.emplace_back();
    if (!exchange.receive(&head, sizeof head) || !exchange.receiveText(item.fault, head.faultLength))
      return std::nullopt;
    item.unit = head.unit;
    if (item.fault.empty() && !exchange.receiveAll(item.values, answer.stepCount)) return std::nullopt;
  }
  if (!content.times.empty()) content.start = dateOfSecond(answer.startSecond);
  exchange.finish();
  return content;
}

}  // namespace mirevo
