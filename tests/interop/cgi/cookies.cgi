#!/bin/sh
# Two cookies; the second is the session.
text="cookie ${HTTP_COOKIE-}"
printf 'Set-Cookie: first=1; Path=/\r\nSet-Cookie: session=42; Path=/; HttpOnly\r\n'
printf 'Content-Type: text/plain\r\nContent-Length: %s\r\n\r\n%s' "${#text}" "$text"
