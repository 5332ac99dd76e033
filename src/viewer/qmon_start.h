#pragma once

#include <functional>
#include <string>

namespace mirevo {

/// Starts the progress viewer with a run: `run`, which must not return, is called in a process of its own, and this one
/// becomes its viewer. `prepare` is called in it first, before a signal can reach it: it makes the run tell of signals.
/// Returns the viewer's exit code; when no process can be made the run goes on in this one, unwatched. To be called
/// before this process has opened anything.
int qmonStart(const std::string& setupFile, const std::function<void()>& prepare, const std::function<void()>& run);

}  // namespace mirevo
