#pragma once

#include <functional>
#include <string>

namespace mirevo {

/// Starts a run with its progress viewer: `run`, which must not return, is called in a process of its own, and this
/// process becomes the viewer. In the run's process `prepare` is called first, before a signal can reach it, to install
/// the signal handlers. Returns the viewer's exit code; if no process can be made, the run is made in this one, without
/// a viewer. To be called before this process has opened any file.
int qmonStart(const std::string& setupFile, const std::function<void()>& prepare, const std::function<void()>& run);

}  // namespace mirevo
