#pragma once

// URL escaping of zero-terminated byte strings (form encoding: a space is "+"). Any thread.
namespace Util {

// Copies letters, digits and "-_.!~*'()", turns a space into "+" and every other byte into "%XX"
// (upper-case hex). Stops before an escape that would not fit in outSize together with the
// terminator, so a buffer of three bytes per input byte plus one always takes everything.
// Returns the number of characters written, terminator excluded.
unsigned int UrlEncode(const char* in, char* out, unsigned int outSize);

// Turns "+" into a space and "%" with two hex digits (either case) into that byte; a "%" without
// two hex digits becomes "?" and the characters after it are decoded as usual. out needs room
// for one byte per input byte plus the terminator. Returns the number of bytes written,
// terminator excluded (a decoded "%00" counts).
unsigned int UrlDecode(const char* in, char* out);

}  // namespace Util
