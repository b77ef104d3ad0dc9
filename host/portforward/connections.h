// The kernel's connection tracking, through libnetfilter_conntrack: which connections a port forward has open.
#ifndef HOST_PORTFORWARD_CONNECTIONS_H
#define HOST_PORTFORWARD_CONNECTIONS_H

#include <cstdint>
#include <memory>
#include <vector>

struct nf_conntrack;
struct nfct_handle;

namespace vornhost {

/// An IPv4 connection whose destination was translated. Addresses in host order; ports are 0 for a protocol without.
struct TranslatedConnection {
  int protocol = 0;          ///< IPPROTO_*
  uint32_t outerAddress = 0; ///< what the client called
  uint16_t outerPort = 0;
  uint32_t target = 0; ///< who answers
  uint16_t targetPort = 0;
  uint32_t peer = 0; ///< whom the answers go to: the client, or the router for one of the same LAN
  uint16_t peerPort = 0;
  std::shared_ptr<nf_conntrack> entry;
};

/// Operations throw std::system_error when the kernel cannot be asked. An object belongs to one thread.
class Connections {
public:
  Connections();

  std::vector<TranslatedConnection> List();
  /// One that has ended by itself is no error.
  void Delete(const TranslatedConnection &connection);

private:
  struct Deleter {
    void operator()(nfct_handle *handle) const;
  };
  std::unique_ptr<nfct_handle, Deleter> handle_;
};

} // namespace vornhost

#endif
