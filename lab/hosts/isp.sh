# shellcheck shell=bash
# The internet provider: addresses and names (dnsmasq), a web page, and the package server (HTTPS).

# The certificate authority is the home's own; the router gets its certificate to trust, and nobody else ever does.
make_certificates() { # FOLDER
  local key=(-newkey ec -pkeyopt ec_paramgen_curve:P-256 -nodes)
  openssl req -x509 "${key[@]}" -days 2 -subj "/CN=Home CA" -keyout "$1/ca.key" -out "$1/ca.pem"
  openssl req "${key[@]}" -subj "/CN=packages.isp.test" -keyout "$1/server.key" -out "$1/server.csr"
  openssl x509 -req -in "$1/server.csr" -CA "$1/ca.pem" -CAkey "$1/ca.key" -CAcreateserial -days 2 \
    -out "$1/server.pem" -extfile <(echo "subjectAltName=DNS:packages.isp.test")
  cp "$1/ca.pem" "$GROUND/ca.pem"
}

prepare() {
  mkdir -p /var/lib/pki /var/www /run/nginx
  make_certificates /var/lib/pki
  echo "page of isp" >/var/www/index.html
  cp -r "$LAB/hosts/isp/packages" /var/www/
  sysctl -qw net.ipv6.conf.all.forwarding=1 net.ipv6.conf.all.ignore_routes_with_linkdown=1
}

start() {
  ip -b - <<COMMANDS
link set eth0 up
addr add 203.0.113.1/24 dev eth0
addr add 2001:db8:1::1/64 dev eth0
link set eth1 up
addr add 198.51.100.1/24 dev eth1
addr add 192.0.2.80/32 dev lo
addr add 2001:db8:80::80/128 dev lo
addr add 2001:db8:9::1/64 dev eth1
route add 2001:db8:2::/64 via fe80::5eff:fe10:1 dev eth0 metric 100
route add 2001:db8:2::/64 via fe80::5eff:fe10:2 dev eth1 metric 200
COMMANDS
  # Both go to the background once their sockets are bound; nothing has to wait for them.
  dnsmasq --conf-file="$LAB/hosts/isp/dnsmasq.conf" --log-facility="$LOG/isp-dnsmasq"
  nginx -c "$LAB/hosts/isp/nginx.conf" -e "$LOG/isp-nginx"
}
