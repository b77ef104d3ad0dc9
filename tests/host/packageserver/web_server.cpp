#include "tests/host/packageserver/web_server.h"

#include "host/utility/unique_fd.h"
#include "tests/host/files.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/wait.h>

#include <chrono>
#include <csignal>
#include <cstdlib>
#include <sstream>
#include <thread>

namespace hosttest {

namespace {

constexpr const char *kCertificates = R"(set -e
cd /tmp/web
authority() {
  openssl req -x509 -newkey rsa:2048 -nodes -keyout $1.key -out $1.pem -days 30 -subj "/CN=$2"
}
certificate() { # name, authority, alternative name, days
  openssl req -newkey rsa:2048 -nodes -keyout $1.key -out $1.csr -subj "/CN=$1"
  printf 'subjectAltName=%s\n' "$3" > $1.ext
  openssl x509 -req -in $1.csr -CA $2.pem -CAkey $2.key -CAcreateserial -days $4 -extfile $1.ext -out $1.pem
}
authority ca 'Home test'
authority otherca 'Stranger'
certificate good ca IP:127.0.0.1 30
certificate name ca DNS:packages.example.net 30
certificate stranger otherca IP:127.0.0.1 30
certificate expired ca IP:127.0.0.1 -1
)";

constexpr const char *kConfiguration = R"(user root;
daemon off;
worker_processes 1;
pid /tmp/web/pid;
error_log /tmp/web/error.log;
events { worker_connections 64; }
http {
  log_format requests '$server_port $request';
  access_log /tmp/web/requests.log requests;
  client_body_temp_path /tmp/web/t1; proxy_temp_path /tmp/web/t2; fastcgi_temp_path /tmp/web/t3;
  uwsgi_temp_path /tmp/web/t4; scgi_temp_path /tmp/web/t5;
  root /tmp/web/pages;
  server {
    listen 127.0.0.1:8443 ssl;
    ssl_certificate /tmp/web/good.pem; ssl_certificate_key /tmp/web/good.key;
    location /moved/ { return 302 https://127.0.0.1:8443/list/good.php?lang=moved; }
    location /tohttp/ { return 302 http://127.0.0.1:8080/list/good.php; }
    location /tofile/ { return 302 file:///etc/passwd; }
    location /tostranger/ { return 302 https://127.0.0.1:8446/list/good.php; }
    location /loop/ { return 302 https://127.0.0.1:8443$request_uri; }
    location /broken/ { return 500 '{"secret": "SECRET"}'; }
    location /created/ { return 201 '{"secret": "SECRET"}'; }
    location /drip/ { limit_rate 10; }
  }
  server { listen 127.0.0.1:8444 ssl; ssl_certificate /tmp/web/name.pem; ssl_certificate_key /tmp/web/name.key; }
  server { listen 127.0.0.1:8445 ssl; ssl_certificate /tmp/web/expired.pem; ssl_certificate_key /tmp/web/expired.key; }
  server { listen 127.0.0.1:8446 ssl; ssl_certificate /tmp/web/stranger.pem; ssl_certificate_key /tmp/web/stranger.key; }
  server { listen 127.0.0.1:8080; }
}
)";

bool Answers(uint16_t port) {
  const vornhost::UniqueFd probe(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0));
  sockaddr_in address{};
  address.sin_family = AF_INET;
  address.sin_port = htons(port);
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  return connect(probe.Get(), reinterpret_cast<const sockaddr *>(&address), sizeof(address)) == 0;
}

} // namespace

WebServer::WebServer() {
  FreshFolder("/tmp/web/pages");
  WriteText("/tmp/web/make.sh", kCertificates);
  WriteText("/tmp/web/nginx.conf", kConfiguration);
  if (std::system("sh /tmp/web/make.sh > /tmp/web/make.log 2>&1") != 0) { // NOLINT(cert-env33-c): a fixed text
    return;
  }
  pid_ = fork();
  if (pid_ == 0) {
    prctl(PR_SET_PDEATHSIG, SIGTERM);
    execl("/usr/sbin/nginx", "nginx", "-c", "/tmp/web/nginx.conf", "-e", "/tmp/web/error.log", nullptr);
    _exit(127);
  }
  for (int round = 0; round < 500 && !up_; ++round) {
    up_ = Answers(8443) && Answers(8080);
    std::this_thread::sleep_for(std::chrono::milliseconds(10));
  }
}

WebServer::~WebServer() {
  if (pid_ > 0) {
    kill(pid_, SIGTERM);
    waitpid(pid_, nullptr, 0);
  }
}

// nginx writes its line when it has sent the answer, a moment after the client has it.
std::vector<std::string> WebServer::TakeRequests() {
  std::this_thread::sleep_for(std::chrono::milliseconds(50));
  std::istringstream log(ReadText("/tmp/web/requests.log"));
  std::vector<std::string> lines;
  for (std::string line; std::getline(log, line);) {
    lines.push_back(line);
  }
  std::vector<std::string> fresh(lines.begin() + static_cast<std::ptrdiff_t>(seen_), lines.end());
  seen_ = lines.size();
  return fresh;
}

} // namespace hosttest
