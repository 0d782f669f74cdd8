#include "module/service_table.h"

namespace xtok {

ServiceTable& services() {
    static ServiceTable table;
    return table;
}

}  // namespace xtok
