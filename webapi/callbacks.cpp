#include "webapi/callbacks.h"

#include "webapi/log.h"

#include <exception>
#include <utility>

namespace vornwebapi {

Callbacks::Callbacks(Callbacks &&other) noexcept : entries_(std::exchange(other.entries_, {})) {}

Callbacks &Callbacks::operator=(Callbacks &&other) noexcept {
  if (this != &other) {
    Run();
    entries_ = std::exchange(other.entries_, {});
  }
  return *this;
}

Callbacks::~Callbacks() {
  Run();
}

void Callbacks::Add(void (*function)(void *), void *data) {
  entries_.push_back({function, data});
}

void Callbacks::Run() noexcept {
  for (const Entry &entry : std::exchange(entries_, {})) {
    try {
      entry.function(entry.data);
    } catch (const std::exception &error) {
      Log(LogKind::kModuleFault, "callback after the answer threw: %s", Printable(error.what()).c_str());
    } catch (...) {
      Log(LogKind::kModuleFault, "callback after the answer threw something that is no std::exception");
    }
  }
}

} // namespace vornwebapi
