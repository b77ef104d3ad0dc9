#!/usr/bin/perl
# Connections as the tests need them. PROTOCOL is tcp or udp.
#   traffic.pl answer TEXT PROTOCOL:PORT...         answers whoever connects or sends: "TEXT PROTOCOL PORT"
#   traffic.pl stream FIRST PROTOCOL:PORT...        sends lines numbered from FIRST on, one each 2 ms, to whoever connects
#                                                   or sends, and goes on whether or not it is heard of again
#   traffic.pl ask PROTOCOL ADDRESS PORT            prints the first answer; fails when there is none within a second
#   traffic.pl receive PROTOCOL ADDRESS PORT SECONDS [OWN-PORT]
#                                                   asks each 50 ms for that long and prints "NUMBER MILLISECONDS" for each
#                                                   line that comes; "closed MILLISECONDS" when the other side closes
use strict;
use warnings;
use IO::Select;
use IO::Socket::INET;
use Time::HiRes qw(time);

$| = 1;
$SIG{PIPE} = 'IGNORE';

sub listening {
  my ($protocol, $port) = @_;
  return IO::Socket::INET->new(
    Proto => $protocol, LocalPort => $port, ReuseAddr => 1,
    ($protocol eq 'tcp' ? (Listen => 50) : ())) || die "$protocol $port: $!\n";
}

# Whoever connects to or sends to one of the sockets: [name of the socket, how to send to them].
sub next_peer {
  my ($sockets, $wait) = @_;
  my ($ready) = IO::Select->new(map { $_->[1] } @$sockets)->can_read($wait) or return;
  my ($entry) = grep { $_->[1] == $ready } @$sockets;
  if ($entry->[2] eq 'tcp') {
    my $connection = $ready->accept or return;
    $connection->blocking(0);
    return [$entry->[0], "$connection", sub { defined syswrite($connection, "$_[0]\n") }];
  }
  my $peer = recv($ready, my $data, 2000, 0);
  return [$entry->[0], $peer, sub { send($ready, "$_[0]\n", 0, $peer); 1 }];
}

sub sockets_of {
  return [map { my ($protocol, $port) = split /:/; ["$protocol $port", listening($protocol, $port), $protocol] } @_];
}

sub answer {
  my ($text, @where) = @_;
  my $sockets = sockets_of(@where);
  print "ready\n";
  while (1) {
    my $peer = next_peer($sockets, undef) or next;
    $peer->[2]->("$text $peer->[0]");
  }
}

sub stream {
  my ($number, @where) = @_;
  my $sockets = sockets_of(@where);
  my %peers;
  print "ready\n";
  while (1) {
    my $peer = next_peer($sockets, 0.002);
    $peers{$peer->[1]} //= $peer if $peer;
    $number++;
    for my $key (keys %peers) {
      delete $peers{$key} unless $peers{$key}[2]->($number) or $!{EAGAIN};
    }
  }
}

sub connected {
  my ($protocol, $address, $port, $own) = @_;
  return IO::Socket::INET->new(
    Proto => $protocol, PeerAddr => $address, PeerPort => $port, Timeout => 1, ($own ? (LocalPort => $own) : ()));
}

sub ask {
  my $socket = connected(@_) or exit 1;
  $socket->send("hello") if $_[0] eq 'udp';
  IO::Select->new($socket)->can_read(1) or exit 1;
  sysread($socket, my $answer, 2000) or exit 1;
  print $answer;
}

sub receive {
  my ($protocol, $address, $port, $seconds, $own) = @_;
  my $socket = connected($protocol, $address, $port, $own) or die "no connection: $!\n";
  my ($start, $asked, $rest) = (time, 0, '');
  my $now = sub { int((time - $start) * 1000) };
  while (time < $start + $seconds) {
    if (time > $asked + 0.05) {
      syswrite($socket, "hello\n");
      $asked = time;
    }
    IO::Select->new($socket)->can_read(0.05) or next;
    my $got = sysread($socket, $rest, 65536, length $rest);
    if (!$got && $protocol eq 'tcp') {
      print "closed ", $now->(), "\n";
      return;
    }
    print "$1 ", $now->(), "\n" while $rest =~ s/^(.*)\n//;
  }
}

my %commands = (answer => \&answer, stream => \&stream, ask => \&ask, receive => \&receive);
my $command = $commands{shift @ARGV} or die "no such command\n";
$command->(@ARGV);
