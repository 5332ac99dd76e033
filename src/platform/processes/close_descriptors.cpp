#include "platform/processes/close_descriptors.h"

#include <algorithm>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <unistd.h>

namespace mirevo {

void closeDescriptors(int first, int last) {
  if (first > last) return;
  if (::syscall(SYS_close_range, static_cast<unsigned>(first), static_cast<unsigned>(last), 0U) == 0) return;
  constexpr rlim_t kMost = 65536;  // a kernel without that call
  rlimit limit{};
  const rlim_t count = ::getrlimit(RLIMIT_NOFILE, &limit) == 0 ? std::min(limit.rlim_cur, kMost) : kMost;
  for (int fd = first; fd <= last && fd < static_cast<int>(count); ++fd) ::close(fd);
}

}  // namespace mirevo
