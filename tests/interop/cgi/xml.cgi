#!/usr/bin/perl
# An XML service: tells what arrived, the XML of the request included. "fault" as the query makes it
# a fault with status 500. The value of <joined> runs over two lines.
use strict;
use warnings;

my $request = do { local $/; <STDIN> } // '';
$request =~ s/<\?xml.*?\?>\s*//;
$request =~ s/\s+\z//;
my $query = $ENV{QUERY_STRING} // '';
my $user = $ENV{REMOTE_USER} // '';
my $reply = qq(<?xml version="1.0"?>\n<reply method="$ENV{REQUEST_METHOD}" user="$user">\n)
  . qq(<joined>one\r\ntwo</joined>$request</reply>\n);

print "Status: 500 Internal Server Error\r\n" if $query eq 'fault';
print "Content-Type: application/xml\r\nContent-Length: " . length($reply) . "\r\n\r\n$reply";
