#!/bin/sh
# A response with 100 header lines of its own.
text=finished
i=0
while [ "$i" -lt 100 ]; do
  printf 'X-Filler-%s: %s\r\n' "$i" "$i"
  i=$((i + 1))
done
printf 'Content-Type: text/plain\r\nContent-Length: %s\r\n\r\n%s' "${#text}" "$text"
