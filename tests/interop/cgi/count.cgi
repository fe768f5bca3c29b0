#!/usr/bin/perl
# Takes a streamed multipart upload and counts its bytes. The length that the request announces says
# nothing: the body ends with the closing boundary, or where the client goes away. The count is
# written to COUNT_FILE as "BYTES closed" or "BYTES cut", and answered. COUNT_FILE.first tells that
# the first bytes have come.
use strict;
use warnings;

$SIG{TERM} = 'IGNORE';    # the server's way to say that the client is gone; the pipe says it, too
sub note {
  my ($suffix, $text) = @_;
  open my $file, '>', "$ENV{COUNT_FILE}.new" or die "COUNT_FILE: $!";
  print $file $text;
  close $file;
  rename "$ENV{COUNT_FILE}.new", "$ENV{COUNT_FILE}$suffix";
}

my ($boundary) = ($ENV{CONTENT_TYPE} // '') =~ /boundary=(\S+)/;
my $end = "--$boundary--\r\n";
my ($count, $tail) = (0, '');
while (my $got = sysread STDIN, my $piece, 1 << 20) {
  note('.first', '') if $count == 0;
  $count += $got;
  $tail = substr $tail . $piece, -length $end;
  last if $tail eq $end;
}

my $text = "$count " . ($tail eq $end ? 'closed' : 'cut') . "\n";
note('', $text);
print "Content-Type: text/plain\r\nConnection: close\r\n\r\n$text";
