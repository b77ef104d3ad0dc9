#include "host/network/current_topology.h"

#include "host/network/names.h"
#include "host/utility/unique_fd.h"

#include <linux/if_link.h>
#include <linux/netlink.h>
#include <linux/rtnetlink.h>
#include <net/if.h>
#include <sys/ioctl.h>
#include <sys/socket.h>
#include <sys/time.h>

#include <array>
#include <cerrno>
#include <cstring>
#include <filesystem>

namespace vornhost {

namespace {

namespace fs = std::filesystem;

enum class WanState { kFailed, kAbsent, kFree, kPort };

// RTM_GETLINK by name, without the statistics, which are most of an answer.
struct LinkQuestion {
  nlmsghdr header;
  ifinfomsg link;
  rtattr nameHead;
  std::array<char, NLMSG_ALIGN(sizeof(kWanPort))> name;
  rtattr maskHead;
  uint32_t mask;
};

LinkQuestion AskForWanPort(uint32_t sequence) {
  LinkQuestion question{};
  question.header.nlmsg_len = sizeof(question);
  question.header.nlmsg_type = RTM_GETLINK;
  question.header.nlmsg_flags = NLM_F_REQUEST;
  question.header.nlmsg_seq = sequence;
  question.nameHead = {RTA_LENGTH(sizeof(kWanPort)), IFLA_IFNAME};
  std::memcpy(question.name.data(), kWanPort, sizeof(kWanPort));
  question.maskHead = {RTA_LENGTH(sizeof(uint32_t)), IFLA_EXT_MASK};
  question.mask = RTEXT_FILTER_SKIP_STATS;
  return question;
}

int MasterIn(const nlmsghdr *answer) {
  const auto *link = static_cast<const ifinfomsg *>(NLMSG_DATA(answer));
  auto left = static_cast<int>(IFLA_PAYLOAD(answer));
  for (const rtattr *attribute = IFLA_RTA(link); RTA_OK(attribute, left); attribute = RTA_NEXT(attribute, left)) {
    if (attribute->rta_type == IFLA_MASTER) {
      int master = 0;
      std::memcpy(&master, RTA_DATA(attribute), sizeof(master));
      return master;
    }
  }
  return 0;
}

class KernelLink {
public:
  // @param[out] master  the bridge's name when the WAN port is the port of one
  WanState GetWan(std::string &master) {
    for (int attempt = 0; attempt < 2; ++attempt) { // a socket that lost its step is opened anew, once
      if (Open()) {
        const WanState state = Ask(master);
        if (state != WanState::kFailed) {
          return state;
        }
        socket_.Reset();
      }
    }
    return WanState::kFailed;
  }

  bool Exists(const char *name) {
    ifreq request{};
    std::strncpy(request.ifr_name, name, sizeof(request.ifr_name) - 1);
    return Open() && ioctl(socket_.Get(), SIOCGIFINDEX, &request) == 0;
  }

private:
  bool Open() {
    if (!socket_.IsOpen()) {
      socket_.Reset(socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC, NETLINK_ROUTE));
      const timeval limit{1, 0};
      if (socket_.IsOpen()) {
        setsockopt(socket_.Get(), SOL_SOCKET, SO_RCVTIMEO, &limit, sizeof(limit));
      }
    }
    return socket_.IsOpen();
  }

  WanState Ask(std::string &master) {
    const LinkQuestion question = AskForWanPort(++sequence_);
    if (send(socket_.Get(), &question, sizeof(question), 0) != static_cast<ssize_t>(sizeof(question))) {
      return WanState::kFailed;
    }
    alignas(nlmsghdr) std::array<char, 8192> buffer; // not cleared: this is asked tens of thousands of times a second
    ssize_t got = 0;
    do {
      got = recv(socket_.Get(), buffer.data(), buffer.size(), MSG_TRUNC);
    } while (got < 0 && errno == EINTR);
    const auto *answer = reinterpret_cast<const nlmsghdr *>(buffer.data());
    if (got > static_cast<ssize_t>(buffer.size()) || !NLMSG_OK(answer, got) || answer->nlmsg_seq != sequence_) {
      return WanState::kFailed;
    }
    return Read(answer, master);
  }

  WanState Read(const nlmsghdr *answer, std::string &master) {
    if (answer->nlmsg_type == NLMSG_ERROR) {
      const auto *error = static_cast<const nlmsgerr *>(NLMSG_DATA(answer));
      return error->error == -ENODEV ? WanState::kAbsent : WanState::kFailed;
    }
    const int index = MasterIn(answer);
    if (index == 0) {
      return WanState::kFree;
    }
    ifreq request{};
    request.ifr_ifindex = index;
    if (ioctl(socket_.Get(), SIOCGIFNAME, &request) != 0) {
      return WanState::kFailed;
    }
    master = request.ifr_name;
    return WanState::kPort;
  }

  UniqueFd socket_;
  uint32_t sequence_ = 0;
};

KernelLink &ThreadsLink() {
  thread_local KernelLink link;
  return link;
}

} // namespace

const char *CurrentTopology() {
  KernelLink &link = ThreadsLink();
  std::string master;
  switch (link.GetWan(master)) {
  case WanState::kFree:
    return link.Exists(kLanBridge) ? kRouterTopology : nullptr;
  case WanState::kPort:
    if (master == kOneBridge) {
      return kBridgeTopology;
    }
    // Also when its adapter was pulled out: what could not be told could not be left.
    return master == kLanBridge ? kClientTopology : nullptr;
  case WanState::kAbsent:
  case WanState::kFailed:
    break;
  }
  return nullptr;
}

bool HasInterface(const char *name) {
  return ThreadsLink().Exists(name);
}

std::vector<std::string> WirelessInterfaces() {
  std::vector<std::string> out;
  std::error_code failed;
  for (fs::directory_iterator entry("/sys/class/net", failed), end; !failed && entry != end; entry.increment(failed)) {
    std::error_code ignored;
    if (fs::exists(entry->path() / "phy80211", ignored)) {
      out.push_back(entry->path().filename());
    }
  }
  return out;
}

} // namespace vornhost
