#include "tools/ports.h"

#include <libserialport.h>

#include <cstdio>
#include <iomanip>
#include <ostream>
#include <string>

#include "tools/fault_report.h"
#include "tools/json_line.h"

namespace xtok::tools {

namespace {

std::string transportOf(sp_port* port) {
    switch (sp_get_port_transport(port)) {
        case SP_TRANSPORT_USB: {
            int vendor = 0;
            int product = 0;
            char ids[32] = "usb";
            if (sp_get_port_usb_vid_pid(port, &vendor, &product) == SP_OK) {
                std::snprintf(ids, sizeof ids, "usb %04x:%04x", vendor, product);
            }
            return ids;
        }
        case SP_TRANSPORT_BLUETOOTH:
            return "bluetooth";
        default:
            return "native";
    }
}

}  // namespace

int runPorts(bool json, std::ostream& out, std::ostream& err) {
    sp_port** ports = nullptr;
    if (sp_list_ports(&ports) != SP_OK) {
        char* why = sp_last_error_message();
        reportFaults(
            {std::string("cannot list the serial ports: ") + (why ? why : "unknown error")}, json,
            out, err);
        sp_free_error_message(why);
        return 1;
    }
    std::string list;
    int count = 0;
    for (sp_port** port = ports; *port; ++port, ++count) {
        const char* description = sp_get_port_description(*port);
        list += (list.empty() ? "" : ",") + JsonLine()
                                                .text("name", sp_get_port_name(*port))
                                                .text("transport", transportOf(*port))
                                                .text("description", description ? description : "")
                                                .str();
        if (!json) {
            out << std::left << std::setw(20) << sp_get_port_name(*port) << std::setw(16)
                << transportOf(*port) << (description ? description : "") << "\n";
        }
    }
    sp_free_port_list(ports);
    if (json) {
        out << JsonLine().flag("ok", true).raw("ports", "[" + list + "]").str() << std::endl;
        return 0;
    }
    if (count == 0) {
        out << "no serial ports found\n";
    }
    out << "Pseudo-terminals (/dev/pts/N) are not listed; give their path as the port.\n"
        << "A configuration's com1 ... com16 are /dev/ttyS0 ... /dev/ttyS15 unless --map "
           "says otherwise.\n";
    return 0;
}

}  // namespace xtok::tools
