#pragma once

namespace Network {

// Finish codes of an HttpConnection: 0 for a completed exchange (whatever its
// HTTP status), a negative value for each failure class a caller can act on.
const int HTTP_FINISHED_OK = 0;
// Any failure not covered below.
const int HTTP_GENERIC_ERROR_CODE = -1;
// Nothing moved in either direction for the request's timeout, or connecting
// took longer than it.
const int HTTP_TIMEOUT_ERROR_CODE = -2;
const int HTTP_CONNECTION_REFUSED_ERROR_CODE = -3;
const int HTTP_HOST_NOT_RESOLVED_ERROR_CODE = -4;
// The peer closed or reset the connection before the exchange was complete.
const int HTTP_CONNECTION_LOST_ERROR_CODE = -5;
// The server's answer is not valid HTTP (a head cut short, a Content-Length
// that is not one clear number, broken chunks, a head beyond libcurl's
// limits), or it redirects in loops.
const int HTTP_BAD_RESPONSE_ERROR_CODE = -6;
// The request cannot be made: malformed URL or a scheme other than http(s).
const int HTTP_BAD_REQUEST_ERROR_CODE = -7;
const int HTTP_TLS_ERROR_CODE = -8;
// No HttpEngine existed when the connection started, or it went away while
// the connection ran.
const int HTTP_NO_ENGINE_ERROR_CODE = -9;
// The answer's body grew beyond the connection's limit (see
// HttpConnection::setMaxBodySize); the transfer was stopped there.
const int HTTP_BODY_TOO_LARGE_ERROR_CODE = -10;
// The platform reports the network as unreachable (at the start or when the
// transfer failed). The network manager switches to offline mode on it.
const int HTTP_OFFLINE_ERROR_CODE = -1073741825;

}  // namespace Network
