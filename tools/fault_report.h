// Faults as every xtok-host command reports them: a line each on standard
// error, or under --json one result object on standard output, shaped as
// every result is: {"ok":false,"error":"first; second","errors":[...]}.
#pragma once

#include <iosfwd>
#include <string>
#include <vector>

namespace xtok::tools {

void reportFaults(const std::vector<std::string>& faults, bool json, std::ostream& out,
                  std::ostream& err);

}  // namespace xtok::tools
