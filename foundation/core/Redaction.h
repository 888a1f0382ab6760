#pragma once
// The one place that knows which values are secret, for everything that goes
// into a trace line: URLs, header lists and identity answers.
//
// The values of password, client_secret, refresh_token, token, bearer_token,
// access_token, device_token and Authorization (keys compared without regard
// to case) become "***"; everything else stays byte for byte, keys and their
// order included, so a trace line still says which call went where. It finds
//   - query and form fields, "key=value" after the start of the text, "?",
//     "&" or a line break; the key may be percent-encoded, and the value runs
//     to "&", "#", a quote or the end of the line, however it is encoded;
//   - JSON members at any depth, "key": value; a string value becomes
//     "***", and so does any other value (a number, an object, an array);
//   - header lines, "Name: value" at the start of a line; the rest of the
//     line becomes "***" ("Authorization: Bearer X" -> "Authorization: ***").
// Trace one header of a list per call, as "Name: value".
//
// Robust on any bytes: never throws for the text's sake, and its time grows
// linearly with the text. Any thread.

#include <string>

namespace tolmocore {
namespace debug {

std::string RedactSecrets(const std::string& text);

}  // namespace debug
}  // namespace tolmocore
