// Responses that repeat what arrived.
#ifndef TARNWICK_TOOLS_TWCAMSIM_ECHO_H_
#define TARNWICK_TOOLS_TWCAMSIM_ECHO_H_

#include "tools/twcamsim/profile.h"

// Lines of text: method and version, query, type, cookie, user, body.
Response EchoAsText(const Exchange& exchange);

// The same as an object with "success":true.
Response EchoAsJson(const Exchange& exchange);

// A document that holds the request's own one; a fault with 500 when the query is "fault". Its
// element "joined" runs over two lines.
Response EchoAsXml(const Exchange& exchange);

#endif  // TARNWICK_TOOLS_TWCAMSIM_ECHO_H_
