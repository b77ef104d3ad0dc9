// Work that modules registered to be done after an answer.
#ifndef WEBAPI_CALLBACKS_H
#define WEBAPI_CALLBACKS_H

#include "webapi/export.h"

#include <vector>

namespace vornwebapi {

/// Functions and their data, in the order of registration. Each is called once: by Run, or by the destructor at the
/// latest, so that no path loses one. Not for use by two threads at once.
class VORN_WEBAPI_EXPORT Callbacks {
public:
  Callbacks() = default;
  Callbacks(Callbacks &&other) noexcept;
  Callbacks(const Callbacks &) = delete;
  Callbacks &operator=(const Callbacks &) = delete;
  Callbacks &operator=(Callbacks &&other) noexcept;
  ~Callbacks();

  void Add(void (*function)(void *), void *data);
  bool Empty() const { return entries_.empty(); }
  /// What a function throws is caught and logged.
  void Run() noexcept;

private:
  struct Entry {
    void (*function)(void *);
    void *data;
  };
  std::vector<Entry> entries_;
};

} // namespace vornwebapi

#endif
