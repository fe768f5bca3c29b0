#!/bin/sh
# Digest as older devices ask for it: without qop. The operator's password is gate-7.
nonce=5f3d9c
given() { printf '%s' "${HTTP_AUTHORIZATION-}" | sed -n "s/.*[ ,]$1=\"\([^\"]*\)\".*/\1/p"; }
md5() { printf '%s' "$1" | md5sum | cut -d ' ' -f 1; }

wanted=$(md5 "$(md5 operator:camera:gate-7):$nonce:$(md5 "$REQUEST_METHOD:$REQUEST_URI")")
cat >/dev/null
if [ "$(given response)" = "$wanted" ] && [ "$(given nonce)" = "$nonce" ]; then
  printf 'Content-Type: text/plain\r\nContent-Length: 8\r\n\r\nwelcome\n'
else
  printf 'Status: 401 Unauthorized\r\nWWW-Authenticate: Digest realm="camera", nonce="%s"\r\n' \
    "$nonce"
  printf 'Content-Type: text/plain\r\nContent-Length: 8\r\n\r\nrefused\n'
fi
