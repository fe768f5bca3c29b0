#!/bin/sh
# A camera's command: keeps the form that was posted, and says that it worked.
cat >"$DOCUMENT_ROOT/../posted"
printf 'Content-Type: text/plain\r\n\r\nok\n'
