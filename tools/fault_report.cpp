#include "tools/fault_report.h"

#include <ostream>

#include "tools/json_line.h"

namespace xtok::tools {

void reportFaults(const std::vector<std::string>& faults, bool json, std::ostream& out,
                  std::ostream& err) {
    if (!json) {
        for (const std::string& fault : faults) {
            err << "xtok-host: " << fault << '\n';
        }
        err.flush();
        return;
    }
    std::string joined;
    std::string list;
    for (const std::string& fault : faults) {
        joined += (joined.empty() ? "" : "; ") + fault;
        list += (list.empty() ? "" : ",") + jsonString(fault);
    }
    out << JsonLine().flag("ok", false).text("error", joined).raw("errors", "[" + list + "]").str()
        << std::endl;
}

}  // namespace xtok::tools
