# check_names.sh FOLDER: the framework could serve any module, and names nothing of what one is about.
set -eu
if grep -rniE 'router|topology|gateway|wifi|wireless|hostapd|dnsmasq|nftables|firewall|bridge|netfilter|dhcp' "$1"; then
  echo "the framework is not to know of these"
  exit 1
fi
