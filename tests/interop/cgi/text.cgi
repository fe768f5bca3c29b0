#!/bin/sh
# Tells what arrived, in lines of text and with a Content-Length.
body=$(cat)
text="$REQUEST_METHOD $SERVER_PROTOCOL
query $QUERY_STRING
type ${CONTENT_TYPE-}
cookie ${HTTP_COOKIE-}
user ${REMOTE_USER-}
body $body
"
printf 'Content-Type: text/plain\r\nContent-Length: %s\r\n\r\n%s' "${#text}" "$text"
