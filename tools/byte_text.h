// Byte strings shown to a person and typed back by one: tokens are free-form
// bytes, so control characters must stay visible and be enterable.
#pragma once

#include <string>

namespace xtok::tools {

/// Printable ASCII as it is; backslash, double quote and every other byte as
/// an escape (\\, \", \n, \r, \t, then `otherEscape` with the byte, \xHH by
/// default). unescapeBytes reverses the default form.
std::string escapeBytes(const std::string& bytes, const char* otherEscape = "\\x%02X");

/// "41 42 03": two upper-case digits per byte, blank-separated.
std::string hexBytes(const std::string& bytes);

/// Takes \\ \" \n \r \t \0 and \xHH; other characters stand for themselves.
/// False with `error` set on an escape it does not know or a cut-off one.
bool unescapeBytes(const std::string& text, std::string& bytes, std::string& error);

}  // namespace xtok::tools
