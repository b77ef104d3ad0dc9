# shellcheck shell=bash
# The router: the product as it is installed on a Debian, with the configuration of packaging/ and this home's additions.

prepare() {
  own_programs "$HOST"
  install_product
  configure
}

# Everything is made by root, as the product demands of the programs that it runs.
install_product() {
  cmake --install "$BUILD" --prefix /usr >"$LOG/router-install"
}

configure() {
  local examples=/usr/vorn/share/examples
  mkdir -p /etc/sysconfig/network-scripts /etc/vorn /etc/dnsmasq.d
  cp "$examples"/ifcfg-* /etc/sysconfig/network-scripts/
  cp "$examples/dnsmasq.conf" /etc/dnsmasq.d/vorn.conf
  cp "$examples/webd.conf" /etc/vorn/
  cp "$LAB/hosts/router/addresses" /etc/vorn/addresses
  cat >/etc/vorn/packageserver.conf <<CONF
url=https://packages.isp.test/
cafile=/etc/vorn/packageserver-ca.pem
CONF
}

start() {
  cp "$GROUND/ca.pem" /etc/vorn/packageserver-ca.pem # the provider has made it by now
  launch syslogd busybox syslogd -n -S -O "$LOG/syslog"
  while [ ! -S /run/dev-log ]; do sleep 0.005; done
  /usr/vorn/sbin/vorntimecontrol --restore
  /usr/vorn/sbin/vorntopology start
  launch vornwatch /usr/vorn/sbin/vornwatch # as vorn-watch.service does
  launch vornroutes /usr/vorn/sbin/vornroutes watch # as vorn-routes.service does
  # The provider routes this prefix here; a switch takes it away with lbr0. Nobody else has the address, and until a look
  # for a duplicate had ended, dnsmasq would advertise no prefix.
  ip address add 2001:db8:2::1/64 dev lbr0 nodad
  dnsmasq --conf-file=/etc/dnsmasq.d/vorn.conf --dhcp-hostsfile=/etc/vorn/addresses --no-ping \
    --log-facility="$LOG/router-dnsmasq"
  launch vorndevices /usr/vorn/sbin/vorndevices watch # as vorn-devices.service does
}
