#include "algorithms/searches/side_by_side.h"

#include <cassert>
#include <condition_variable>
#include <csignal>
#include <deque>
#include <exception>
#include <mutex>
#include <optional>
#include <span>
#include <string>
#include <system_error>
#include <thread>
#include <utility>

#include <fmt/core.h>

#include "common/fatal_error.h"

namespace mirevo {
namespace {

/// Signals are for the thread of the program, which ends model runs and closes files. A fault of a search itself still
/// ends the program.
class SignalsBlocked final {
 public:
  SignalsBlocked() {
    sigset_t set;
    ::sigfillset(&set);
    for (const int fault : {SIGSEGV, SIGBUS, SIGFPE, SIGILL, SIGABRT}) ::sigdelset(&set, fault);
    ::pthread_sigmask(SIG_SETMASK, &set, &before_);
  }
  SignalsBlocked(const SignalsBlocked&) = delete;
  SignalsBlocked& operator=(const SignalsBlocked&) = delete;
  ~SignalsBlocked() { ::pthread_sigmask(SIG_SETMASK, &before_, nullptr); }

 private:
  sigset_t before_{};
};

/// A search on a thread of its own. Either it or the caller of goOn() runs, the other waits.
class Lane final : public Evaluator {
 public:
  Lane(const SearchRun& run, const PeriodicStep& periodicStep) : run_(run), periodicStep_(periodicStep) {}
  Lane(const Lane&) = delete;
  Lane& operator=(const Lane&) = delete;
  ~Lane() override { abandon(); }

  void start() {
    const SignalsBlocked blocked;
    try {
      thread_ = std::thread([this] { work(); });
    } catch (const std::system_error& error) {
      fatalError("Error: Unable to run the searches side by side", error.what());
    }
  }
  /// Lets the search compute until it waits for results or has ended. Throws what it throws, and what `evaluator`
  /// throws when it settles the aggregates.
  void goOn(Evaluator& evaluator) {
    do {
      request_ = nullptr;
      passTurn(Turn::search);
      if (request_) request_(evaluator);
    } while (request_);
    if (failure_) std::rethrow_exception(std::exchange(failure_, nullptr));
  }
  /// Hands a result over; true if the search can go on with it.
  bool take(EvaluationResult result) {
    if (hasEnded_) return false;  // it does not wait for what it has submitted
    results_.push_back(std::move(result));
    return results_.size() == wanted_;
  }
  std::vector<ParameterSet> takeProposals() { return std::exchange(proposals_, {}); }
  bool hasEnded() const { return hasEnded_; }
  const SearchSummary& summary() const { return summary_; }

  // The search's own calls, on its thread.
  std::vector<EvaluationResult> evaluateParameterSets(std::span<const ParameterSet> sets,
                                                      DispatchMode /*mode*/) override {
    assert(underWay_ == 0);
    if (sets.empty()) return {};
    submit(sets);
    waitFor(sets.size());
    underWay_ = 0;
    return std::exchange(results_, {});
  }
  void submit(std::span<const ParameterSet> sets) override {
    proposals_.insert(proposals_.end(), sets.begin(), sets.end());
    underWay_ += sets.size();
  }
  EvaluationResult awaitFirst() override {
    assert(underWay_ > 0);
    waitFor(1);
    --underWay_;
    return std::move(results_.front());
  }
  void settleAggregates(std::span<EvaluationResult> sample) override {
    ask([sample](Evaluator& evaluator) { evaluator.settleAggregates(sample); });
  }

 private:
  enum class Turn { caller, search };
  struct Abandoned {};

  /// To be called by the one whose turn it is; returns when it is so again.
  void passTurn(Turn to) {
    std::unique_lock lock(mutex_);
    const Turn own = std::exchange(turn_, to);
    changed_.notify_all();
    changed_.wait(lock, [&] { return turn_ == own; });
  }
  void ask(std::function<void(Evaluator&)> request) {
    request_ = std::move(request);
    passToCaller();
  }
  void passToCaller() {
    passTurn(Turn::caller);
    if (isAbandoned_) throw Abandoned();
  }
  void waitFor(std::size_t count) {
    results_.clear();
    wanted_ = count;
    passToCaller();
    assert(results_.size() == count);
  }
  void work() {
    {
      std::unique_lock lock(mutex_);
      changed_.wait(lock, [this] { return turn_ == Turn::search; });
    }
    try {
      if (!isAbandoned_) {
        summary_ = run_(*this, [this](std::string_view line) {
          ask([this, text = std::string(line)](Evaluator&) { periodicStep_(text); });
        });
      }
    } catch (const Abandoned&) {
    } catch (...) {  // thrown again by goOn()
      failure_ = std::current_exception();
    }
    const std::lock_guard lock(mutex_);
    hasEnded_ = true;
    turn_ = Turn::caller;
    changed_.notify_all();
  }
  /// Unwinds the search where it waits, and ends its thread.
  void abandon() {
    if (!thread_.joinable()) return;
    if (!hasEnded_) {
      isAbandoned_ = true;
      request_ = nullptr;
      passTurn(Turn::search);
    }
    thread_.join();
  }

  const SearchRun& run_;
  const PeriodicStep& periodicStep_;
  std::thread thread_;
  std::mutex mutex_;
  std::condition_variable changed_;
  // All that follows belongs to the one whose turn it is.
  Turn turn_ = Turn::caller;
  bool isAbandoned_ = false;
  bool hasEnded_ = false;
  std::exception_ptr failure_;
  std::function<void(Evaluator&)> request_;  ///< what the caller is to do before the search goes on
  std::vector<ParameterSet> proposals_;      ///< not yet handed on
  std::size_t underWay_ = 0;                 ///< sets without a result that the search has taken
  std::size_t wanted_ = 0;                   ///< results for which it waits
  std::vector<EvaluationResult> results_;
  SearchSummary summary_;
};

class SearchesSideBySide final {
 public:
  SearchesSideBySide(Evaluator& evaluator, const std::vector<SearchRun>& searches, const PeriodicStep& periodicStep,
                     const SearchEnd& ended)
      : evaluator_(evaluator), ended_(ended) {
    for (const SearchRun& search : searches) lanes_.emplace_back(search, periodicStep);
  }

  void run() {
    for (std::size_t search = 0; search < lanes_.size(); ++search) {
      lanes_[search].start();
      goOn(search);
    }
    while (!underWay_.empty()) {
      EvaluationResult result = evaluator_.awaitFirst();
      const std::size_t search = underWay_.front();
      underWay_.pop_front();
      if (lanes_[search].take(std::move(result))) goOn(search);
    }
  }

 private:
  void goOn(std::size_t search) {
    Lane& lane = lanes_[search];
    lane.goOn(evaluator_);
    if (lane.hasEnded()) ended_(search, lane.summary());
    const std::vector<ParameterSet> sets = lane.takeProposals();
    if (sets.empty()) return;
    evaluator_.submit(sets);
    underWay_.insert(underWay_.end(), sets.size(), search);
  }

  Evaluator& evaluator_;
  const SearchEnd& ended_;
  std::deque<Lane> lanes_;            ///< where they stay
  std::deque<std::size_t> underWay_;  ///< the search of each set under way, in their order
};

}  // namespace

void runSideBySide(Evaluator& evaluator, const std::vector<SearchRun>& searches, const PeriodicStep& periodicStep,
                   const SearchEnd& ended) {
  SearchesSideBySide(evaluator, searches, periodicStep, ended).run();
}

}  // namespace mirevo
