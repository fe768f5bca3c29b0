#!/usr/bin/perl
# Twenty lines, each sent on its own, without a length: the server sends chunks to a client of
# HTTP/1.1 and closes after the last line for one of HTTP/1.0.
use strict;
use warnings;

$| = 1;
print "Content-Type: text/plain\r\n\r\n";
printf "line %02d %s\n", $_, '.' x (100 * $_) for 1 .. 20;
