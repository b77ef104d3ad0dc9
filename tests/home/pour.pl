#!/usr/bin/perl
# Answers every request with a body without end, 10 kB each hundredth of a second: a download whose every moment shows.
use strict;
use warnings;
use Socket qw(AF_INET6 SOCK_STREAM SOL_SOCKET SO_REUSEADDR IPPROTO_IPV6 IPV6_V6ONLY pack_sockaddr_in6 IN6ADDR_ANY);
use Time::HiRes qw(sleep);

$SIG{PIPE} = $SIG{CHLD} = 'IGNORE';
socket(my $listener, AF_INET6, SOCK_STREAM, 0) or die "socket: $!";
setsockopt($listener, SOL_SOCKET, SO_REUSEADDR, 1);
setsockopt($listener, IPPROTO_IPV6, IPV6_V6ONLY, 0);
bind($listener, pack_sockaddr_in6($ARGV[0], IN6ADDR_ANY)) or die "bind: $!";
listen($listener, 16) or die "listen: $!";
my $body = 'x' x 10000;
while (accept(my $client, $listener)) {
  next if fork;
  syswrite($client, "HTTP/1.0 200 OK\r\n\r\n");
  sleep(0.01) while syswrite($client, $body);
  exit;
}
