#include "host/portforward/connections.h"

#include <arpa/inet.h>
#include <libnetfilter_conntrack/libnetfilter_conntrack.h>

#include <cerrno>
#include <new>
#include <system_error>

namespace vornhost {

namespace {

[[noreturn]] void Fail(const char *what) {
  throw std::system_error(errno, std::generic_category(), what);
}

bool HasPorts(int protocol) {
  switch (protocol) {
  case IPPROTO_TCP:
  case IPPROTO_UDP:
  case IPPROTO_SCTP:
  case IPPROTO_DCCP:
  case IPPROTO_UDPLITE:
    return true;
  default:
    return false; // the attributes then hold something else, such as an ICMP identifier
  }
}

uint32_t Address(const nf_conntrack *entry, nf_conntrack_attr attribute) {
  return ntohl(nfct_get_attr_u32(entry, attribute));
}

TranslatedConnection Read(const nf_conntrack *entry) {
  TranslatedConnection out;
  const auto port = [&entry, &out](nf_conntrack_attr attribute) {
    return HasPorts(out.protocol) ? ntohs(nfct_get_attr_u16(entry, attribute)) : uint16_t{0};
  };
  out.protocol = nfct_get_attr_u8(entry, ATTR_ORIG_L4PROTO);
  out.outerAddress = Address(entry, ATTR_ORIG_IPV4_DST);
  out.outerPort = port(ATTR_ORIG_PORT_DST);
  out.target = Address(entry, ATTR_REPL_IPV4_SRC);
  out.targetPort = port(ATTR_REPL_PORT_SRC);
  out.peer = Address(entry, ATTR_REPL_IPV4_DST);
  out.peerPort = port(ATTR_REPL_PORT_DST);
  out.entry = {nfct_clone(entry), nfct_destroy};
  return out;
}

// Called from C: nothing may be thrown through it.
int Collect(nf_conntrack_msg_type /*type*/, nf_conntrack *entry, void *data) noexcept {
  if ((nfct_get_attr_u32(entry, ATTR_STATUS) & IPS_DST_NAT) != 0) {
    try {
      static_cast<std::vector<TranslatedConnection> *>(data)->push_back(Read(entry));
    } catch (const std::bad_alloc &) {
      return NFCT_CB_FAILURE;
    }
  }
  return NFCT_CB_CONTINUE;
}

} // namespace

void Connections::Deleter::operator()(nfct_handle *handle) const {
  nfct_close(handle);
}

Connections::Connections() : handle_(nfct_open(CONNTRACK, 0)) {
  if (!handle_) {
    Fail("connection tracking");
  }
}

std::vector<TranslatedConnection> Connections::List() {
  std::vector<TranslatedConnection> out;
  nfct_callback_register(handle_.get(), NFCT_T_ALL, Collect, &out);
  const uint32_t family = AF_INET;
  const int result = nfct_query(handle_.get(), NFCT_Q_DUMP, &family);
  nfct_callback_unregister(handle_.get());
  if (result < 0) {
    Fail("list of connections");
  }
  return out;
}

void Connections::Delete(const TranslatedConnection &connection) {
  if (nfct_query(handle_.get(), NFCT_Q_DESTROY, connection.entry.get()) < 0 && errno != ENOENT) {
    Fail("end of a connection");
  }
}

} // namespace vornhost
