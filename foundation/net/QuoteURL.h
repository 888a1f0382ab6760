#pragma once
// Query strings from lists of names and values.

#include "foundation/net/Response.h"

namespace tolmonet {

// "name=value&name=value", each name and value quoted byte by byte: the 65
// characters A-Z a-z 0-9 _ . - stay, every other byte becomes %xx with
// lower-case hex digits (a blank is %20, never +). Order is kept, nothing is
// merged, no leading "?" and no trailing "&". Any thread.
UTF8String QuoteURL(const FormList& pairs);

// The quoting of one text, as above.
UTF8String _Quote(const UTF8String& text);

}  // namespace tolmonet
