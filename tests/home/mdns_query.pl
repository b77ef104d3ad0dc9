#!/usr/bin/perl
# mdns_query.pl ADDRESS NAME: asks the network of ADDRESS by multicast DNS for the PTR records of NAME (a query from an
# ephemeral port, RFC 6762 section 6.7) and prints the readable pieces of the first answer.
use strict;
use warnings;
use IO::Socket::INET;

my ($address, $name) = @ARGV;
my $socket = IO::Socket::INET->new(Proto => 'udp', LocalAddr => $address) or die "$address: $!\n";
setsockopt($socket, 0, 32, inet_aton($address)) or die "IP_MULTICAST_IF: $!\n";
my $question = join('', map { pack('C/a', $_) } split(/\./, $name)) . pack('Cnn', 0, 12, 1);
send($socket, pack('nnnnnn', 0x1234, 0, 1, 0, 0, 0) . $question, 0, sockaddr_in(5353, inet_aton('224.0.0.251')));
my $waiting = '';
vec($waiting, fileno($socket), 1) = 1;
select($waiting, undef, undef, 2) > 0 or die "no answer\n";
recv($socket, my $answer, 9000, 0);
print "$_\n" for $answer =~ /[ -~]{3,}/g;
