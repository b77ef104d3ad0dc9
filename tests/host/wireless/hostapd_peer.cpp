#include "tests/host/wireless/hostapd_peer.h"

#include "host/wireless/control_socket.h"
#include "tests/host/files.h"
#include "tests/host/network/shell.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <csignal>
#include <cstring>
#include <stdexcept>

namespace hosttest {

namespace {

constexpr char kProgram[] = "/usr/sbin/hostapd";

vornhost::UniqueFd Listen(const std::string &path) {
  std::filesystem::create_directories(kControlFolder);
  unlink(path.c_str());
  vornhost::UniqueFd made(socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0));
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::strncpy(address.sun_path, path.c_str(), sizeof(address.sun_path) - 1);
  if (bind(made.Get(), reinterpret_cast<const sockaddr *>(&address), sizeof(address)) != 0) {
    throw std::runtime_error("bind " + path + ": " + std::strerror(errno));
  }
  return made;
}

} // namespace

void WriteHostapdConfig(const std::string &name, const std::string &more) {
  std::filesystem::create_directories("/etc/hostapd");
  WriteText("/etc/hostapd/" + name + ".conf",
            "# a comment\ninterface=" + name + "\ndriver=none\nctrl_interface=" + kControlFolder + "\nssid=" + name +
                "-net\nhw_mode=g\nchannel=1\nwpa=2\n" + "wpa_key_mgmt=WPA-PSK\nwpa_passphrase=secret-home-1\n" + more);
}

FakeHostapd::FakeHostapd(const std::string &name, Answerer answer)
    : path_(std::string(kControlFolder) + "/" + name), answer_(std::move(answer)), socket_(Listen(path_)) {
  int ends[2];
  if (pipe2(ends, O_CLOEXEC) != 0) {
    throw std::runtime_error("pipe");
  }
  stopRead_.Reset(ends[0]);
  stopWrite_.Reset(ends[1]);
  thread_ = std::thread([this] { Serve(); });
}

FakeHostapd::~FakeHostapd() {
  stopWrite_.Reset();
  thread_.join();
  unlink(path_.c_str());
}

std::vector<std::string> FakeHostapd::Requests() {
  const std::lock_guard<std::mutex> lock(mutex_);
  return requests_;
}

void FakeHostapd::Serve() {
  std::array<pollfd, 2> entries{{{socket_.Get(), POLLIN, 0}, {stopRead_.Get(), POLLIN, 0}}};
  for (;;) {
    poll(entries.data(), entries.size(), -1);
    if (entries[1].revents != 0) {
      return;
    }
    std::array<char, 4096> text{};
    sockaddr_un from{};
    socklen_t length = sizeof(from);
    const ssize_t got =
        recvfrom(socket_.Get(), text.data(), text.size(), 0, reinterpret_cast<sockaddr *>(&from), &length);
    if (got < 0) {
      continue;
    }
    const std::string request(text.data(), static_cast<size_t>(got));
    {
      const std::lock_guard<std::mutex> lock(mutex_);
      requests_.push_back(request);
    }
    const auto answer = answer_(request);
    if (answer == kDeath) {
      socket_.Reset();
      return;
    }
    if (answer) {
      sendto(socket_.Get(), answer->data(), answer->size(), 0, reinterpret_cast<const sockaddr *>(&from), length);
    }
  }
}

Answerer WithStations(std::vector<std::string> records) {
  return [records = std::move(records)](const std::string &request) -> std::optional<std::string> {
    if (request == "PING") {
      return "PONG\n";
    }
    if (request == "STATUS") {
      return "state=ENABLED\nphy=phy0\nchannel=1\nbss[0]=none0\nnum_sta[0]=" + std::to_string(records.size()) + "\n";
    }
    if (request == "STA-FIRST") {
      return records.empty() ? "" : records.front();
    }
    if (request.rfind("STA-NEXT ", 0) == 0) {
      for (size_t i = 0; i < records.size(); ++i) {
        if (records[i].rfind(request.substr(9) + "\n", 0) == 0) {
          return i + 1 < records.size() ? records[i + 1] : "";
        }
      }
      return "FAIL\n";
    }
    return "UNKNOWN COMMAND\n";
  };
}

std::string StationText(const std::string &mac, bool authorized) {
  if (!authorized) {
    return mac +
           "\nflags=[AUTH][ASSOC][WMM]\naid=2\ncapability=0x431\nlisten_interval=5\nsupported_rates=02 04 0b 16\n" +
           "timeout_next=NULLFUNC POLL\nrx_packets=3\ntx_packets=4\nrx_bytes=301\ntx_bytes=402\nsignal=-30\n";
  }
  return mac +
         "\nflags=[AUTH][ASSOC][AUTHORIZED][WMM][HT]\naid=1\ncapability=0x431\nlisten_interval=5\n"
         "supported_rates=02 04 0b 16 0c 12 18 24 30 48 60 6c\ntimeout_next=NULLFUNC POLL\n"
         "dot11RSNAStatsSTAAddress=" +
         mac + "\nwpa=2\nAKMSuiteSelector=00-0f-ac-2\nhostapdWPAPTKState=11\nrx_packets=21\ntx_packets=9\n" +
         "rx_bytes=6000000123\ntx_bytes=1406\ninactive_msec=12\nsignal=-52\nrx_rate_info=540\ntx_rate_info=10\n" +
         "connected_time=7\nsupp_op_classes=51515354737475767778797a7b7c7d7e7f80818182\n";
}

RealHostapd::RealHostapd(const std::vector<std::string> &names) {
  std::vector<std::string> words = {kProgram, "-t", "-d", "-f", kHostapdLog};
  for (const std::string &name : names) {
    words.push_back("/etc/hostapd/" + name + ".conf");
  }
  std::vector<char *> arguments;
  for (std::string &word : words) {
    arguments.push_back(word.data());
  }
  arguments.push_back(nullptr);
  pid_ = fork();
  if (pid_ == 0) {
    prctl(PR_SET_PDEATHSIG, SIGKILL);
    execv(kProgram, arguments.data());
    _exit(127);
  }
  for (const std::string &name : names) {
    if (!Eventually(5000, [&name] { return Ask(name, "PING") == "PONG\n"; })) {
      throw std::runtime_error("hostapd does not come up: " + ReadText(kHostapdLog));
    }
  }
}

RealHostapd::~RealHostapd() {
  Signal(SIGKILL);
  waitpid(pid_, nullptr, 0);
}

void RealHostapd::Signal(int number) const {
  kill(pid_, number);
}

std::string RealHostapd::Ask(const std::string &name, const std::string &request) {
  vornhost::ControlSocket control(std::string(kControlFolder) + "/" + name,
                                  std::chrono::steady_clock::now() + std::chrono::seconds(5));
  return control.Ask(request).value_or("<no answer>");
}

bool HasHostapd() {
  return access(kProgram, X_OK) == 0;
}

} // namespace hosttest
