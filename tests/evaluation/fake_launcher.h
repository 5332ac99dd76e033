#pragma once

#include <algorithm>
#include <cassert>
#include <filesystem>
#include <functional>
#include <poll.h>
#include <span>
#include <string>
#include <vector>

#include "platform/processes/process_launcher.h"

namespace mirevo {

/// A launcher without processes, whose clock moves only when it is waited for. The test says for every start, in the
/// order of starts, how long the batch takes, how it ends and what it writes, and so chooses the order of completion.
class FakeLauncher final : public ProcessLauncher {
 public:
  struct Batch {
    double seconds = 1.0;
    BatchFailure failure;
    /// Called with the slot's folder when the batch ends; writes the results.
    std::function<void(const std::string&)> write;
    std::vector<std::string> output;
    std::string leftBehind;
  };
  using Script = std::function<Batch(int start, const std::string& folder)>;  ///< starts count from 1

  explicit FakeLauncher(Script script) : script_(std::move(script)) {}

  bool initialise(const LauncherSettings& settings) override {
    prefix_ = settings.processFolderPrefix;
    baseFolder_ = settings.baseFolder;
    slots_.resize(static_cast<std::size_t>(settings.slotCount));
    for (int slot = 1; slot <= settings.slotCount; ++slot) renewFolder(slot, {});
    return initialiseError.empty();
  }
  bool renewFolder(int slot, const std::function<void()>& /*look*/) override {
    if (!renewError.empty()) return false;
    std::filesystem::remove_all(getProcessFolder(slot));
    std::filesystem::copy(baseFolder_, getProcessFolder(slot), std::filesystem::copy_options::recursive);
    return true;
  }
  const std::string& lastError() const override { return renewError.empty() ? initialiseError : renewError; }
  std::string getProcessFolder(int slot) const override { return prefix_ + std::to_string(slot); }

  void createProcesses(int slot) override {
    assert(!at(slot).running);
    at(slot).running = true;
    at(slot).batch = script_(++starts, getProcessFolder(slot));
    at(slot).end = now + at(slot).batch.seconds;
    mostRunning = std::max(mostRunning, runningCount());
  }

  void isExecuting(int slot, std::int32_t& executing, std::int32_t& status) override {
    Slot& s = at(slot);
    if (s.running && s.end <= now) {
      s.running = false;
      if (s.batch.write) s.batch.write(getProcessFolder(slot));
    }
    executing = s.running ? 1 : 0;
    status = static_cast<std::int32_t>(s.batch.failure.kind == BatchFailure::Kind::none ? BatchStatus::succeeded
                                                                                        : BatchStatus::failed);
  }

  BatchFailure failure(int slot) const override { return at(slot).batch.failure; }
  std::string leftBehind(int slot) const override { return at(slot).batch.leftBehind; }
  std::vector<std::string> lastOutput(int slot, int) const override { return at(slot).batch.output; }

  void waitForChange(double seconds, std::span<const int> readable = {}) override {
    readersWaitedFor += static_cast<int>(readable.size());
    if (!readable.empty()) {  // as if reading took no time
      if (onWait) onWait();
      std::vector<pollfd> readers;
      for (const int descriptor : readable) readers.push_back({descriptor, POLLIN, 0});
      ::poll(readers.data(), readers.size(), static_cast<int>(1000 * seconds));
      return;
    }
    longestWait = std::max(longestWait, seconds);
    double until = now + seconds;
    for (const Slot& slot : slots_) {
      if (slot.running) until = std::min(until, std::max(slot.end, now));
    }
    now = until;
    if (onWait) onWait();
  }

  void haltProcesses() override {
    ++halts;
    for (Slot& slot : slots_) slot.running = false;
  }
  ResistanceUpdate r35UpdateResistanceNumbers(const std::string& fileName) override {
    resistanceFiles.push_back(fileName);
    return resistanceUpdate;
  }

  int runningCount() const {
    return static_cast<int>(std::count_if(slots_.begin(), slots_.end(), [](const Slot& s) { return s.running; }));
  }

  double now = 0.0;
  int starts = 0;
  int halts = 0;
  int mostRunning = 0;
  double longestWait = 0.0;
  int readersWaitedFor = 0;
  std::function<void()> onWait;
  std::string initialiseError;
  std::string renewError;  ///< of renewFolder(), which then fails
  ResistanceUpdate resistanceUpdate = ResistanceUpdate::updated;
  std::vector<std::string> resistanceFiles;

 private:
  struct Slot {
    bool running = false;
    double end = 0.0;
    Batch batch;
  };
  Slot& at(int slot) { return slots_.at(static_cast<std::size_t>(slot - 1)); }
  const Slot& at(int slot) const { return slots_.at(static_cast<std::size_t>(slot - 1)); }

  Script script_;
  std::string prefix_;
  std::string baseFolder_;
  std::vector<Slot> slots_;
};

}  // namespace mirevo
