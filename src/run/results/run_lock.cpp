#include "run/results/run_lock.h"

#include <cerrno>
#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include "common/clock.h"
#include "common/descriptor.h"

namespace mirevo {

RunLock::~RunLock() {
  if (descriptor_ >= 0) ::close(descriptor_);
}

bool RunLock::take(const std::string& setupFile, double patienceSeconds) {
  descriptor_ = ::open(setupFile.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK);
  if (descriptor_ < 0) return true;
  const double deadline = runTimeClock() + patienceSeconds;
  while (::flock(descriptor_, LOCK_EX | LOCK_NB) != 0) {
    if (errno == EINTR) continue;
    if (errno != EWOULDBLOCK) return true;
    if (runTimeClock() >= deadline) return false;
    ::usleep(50'000);
  }
  return true;
}

bool RunLock::isHeld(const std::string& setupFile) {
  const Descriptor file(::open(setupFile.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
  // Holds a shared lock for a moment; a run that starts in the meantime tries again.
  return file.get() >= 0 && ::flock(file.get(), LOCK_SH | LOCK_NB) != 0 && errno == EWOULDBLOCK;
}

}  // namespace mirevo
