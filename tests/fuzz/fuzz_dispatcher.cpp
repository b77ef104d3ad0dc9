// A connection's bytes to the real dispatcher, cut into reads where the input says so: every answer is whole, and how
// the bytes were cut makes no difference to what is answered.
#include "tests/fuzz/demand.h"
#include "tests/fuzz/fuzz_server.h"

#include <cstdint>

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
  if (size < 1) {
    return 0;
  }
  vornfuzz::Renew();
  const std::string bytes = vornfuzz::Fill({reinterpret_cast<const char *>(data) + 1, size - 1});
  const vornfuzz::Talk whole = vornfuzz::Converse(bytes, bytes.size() + 1);
  // What the first one ended is put back, with the secrets that the bytes have.
  vornfuzz::Renew();
  const bool sameSession = bytes == vornfuzz::Fill({reinterpret_cast<const char *>(data) + 1, size - 1});
  const vornfuzz::Talk pieces = vornfuzz::Converse(bytes, data[0] % 16U + 1);
  vornfuzz::Demand(!sameSession || (whole.statuses == pieces.statuses && whole.closed == pieces.closed));
  return 0;
}
