#!/bin/sh
# A JSON service: tells what arrived. Texts with quotes or backslashes are not for it.
body=$(cat)
text="{\"success\":true,\"method\":\"$REQUEST_METHOD\",\"query\":\"$QUERY_STRING\",\
\"user\":\"${REMOTE_USER-}\",\"cookie\":\"${HTTP_COOKIE-}\",\"body\":\"$body\"}"
printf 'Content-Type: application/json\r\nContent-Length: %s\r\n\r\n%s' "${#text}" "$text"
