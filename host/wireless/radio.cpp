#include "host/wireless/radio.h"

#include <linux/nl80211.h>
#include <net/if.h>
#include <netlink/genl/ctrl.h>
#include <netlink/genl/genl.h>
#include <netlink/msg.h>

#include <fstream>
#include <memory>

namespace vornhost {

namespace {

struct SocketDeleter {
  void operator()(nl_sock *socket) const { nl_socket_free(socket); }
};
using Socket = std::unique_ptr<nl_sock, SocketDeleter>;

struct MessageDeleter {
  void operator()(nl_msg *message) const { nlmsg_free(message); }
};
using Message = std::unique_ptr<nl_msg, MessageDeleter>;

// Takes the kernel's description of a radio; each supported mode is an empty attribute of that number.
int TakeModes(nl_msg *answer, void *station) {
  const auto *head = static_cast<const genlmsghdr *>(nlmsg_data(nlmsg_hdr(answer)));
  nlattr *modes = nla_find(genlmsg_attrdata(head, 0), genlmsg_attrlen(head, 0), NL80211_ATTR_SUPPORTED_IFTYPES);
  if (modes != nullptr && nla_find(static_cast<nlattr *>(nla_data(modes)), nla_len(modes), NL80211_IFTYPE_STATION)) {
    *static_cast<bool *>(station) = true;
  }
  return NL_OK;
}

// @return a question about the interface's radio; null when it cannot be made
Message RadioQuestion(nl_sock *socket, unsigned int interface) {
  const int family = genl_ctrl_resolve(socket, NL80211_GENL_NAME); // negative where the kernel has no 802.11
  Message message(family >= 0 ? nlmsg_alloc() : nullptr);
  if (message != nullptr &&
      (genlmsg_put(message.get(), NL_AUTO_PORT, NL_AUTO_SEQ, family, 0, 0, NL80211_CMD_GET_WIPHY, 0) == nullptr ||
       nla_put_u32(message.get(), NL80211_ATTR_IFINDEX, interface) != 0)) {
    message.reset();
  }
  return message;
}

} // namespace

std::optional<int> RadioOf(const std::string &interface) {
  int radio = 0;
  if (std::ifstream("/sys/class/net/" + interface + "/phy80211/index") >> radio) {
    return radio;
  }
  return std::nullopt;
}

bool CanBeStation(const std::string &interface) {
  const unsigned int index = if_nametoindex(interface.c_str());
  const Socket socket(nl_socket_alloc());
  if (index == 0 || socket == nullptr || genl_connect(socket.get()) != 0) {
    return false;
  }
  const Message question = RadioQuestion(socket.get(), index);
  bool station = false;
  if (question == nullptr || nl_socket_modify_cb(socket.get(), NL_CB_VALID, NL_CB_CUSTOM, TakeModes, &station) != 0 ||
      nl_send_auto(socket.get(), question.get()) < 0) {
    return false;
  }
  // The acknowledgement that libnl asks for comes after the answer; without an answer it is the error.
  return nl_wait_for_ack(socket.get()) == 0 && station;
}

} // namespace vornhost
