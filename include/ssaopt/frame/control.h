// Module control: the host's control base class, the module's control object and the per-class
// object counters.
#pragma once

#include <cstdint>

#include "ssaopt/frame/memory.h"
#include "ssaopt/frame/string.h"

// The host's module control base class.
class KvCControl {
public:
  SSAOPT_MODULE_ALLOCATED

  KvCControl() = default;
  KvCControl(const KvCControl&) = default;
  KvCControl& operator=(const KvCControl&) = default;
  virtual ~KvCControl() = default;

  // Stops the module's timer and emits `message`; the default host does nothing with it.
  virtual void stopTimeAndEmitMessage(BxCXString& message);
};

// The library's module control object. The host constructs it and calls boot() before using the
// library, shutdown() at the end. Neither resets the per-class object counters: the classes' static
// boot() operations do that.
//
// Memory: when no host controller is installed (pKVMemory null) at boot(), the module opens a session
// with a pool of its own, from which every library object made until shutdown() takes its memory.
// shutdown() releases that pool with everything in it, so the objects that the library made and that
// no one deletes (payloads, procedures, SSA versions, ...) leak nothing. Graphs and the objects a
// client made with the library's classes are deleted before shutdown(); a graph that is not is
// reported and keeps its memory until it goes. With a host controller installed, boot() and
// shutdown() leave memory to it. Destroying a booted control shuts it down; a copy is not booted.
class KvCSSAControl : public KvCControl {
public:
  KvCSSAControl() = default;
  KvCSSAControl(const KvCSSAControl& other) = default;
  KvCSSAControl& operator=(const KvCSSAControl& other) = default;
  ~KvCSSAControl() override;

  // Both always return true; calling either again does nothing more.
  bool boot();
  bool shutdown();
};

namespace ssaopt {

// Draws the next object index from a per-class counter (s_GlobIndexCnt): the object gets the
// counter's value, the counter moves on, wrapping modulo 2^32.
inline std::uint32_t drawIndex(std::uint32_t& counter) { return counter++; }

}  // namespace ssaopt
