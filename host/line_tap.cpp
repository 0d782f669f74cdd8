#include "host/line_tap.h"

namespace xtok::host {

const char* linkChangeName(LinkChange change) {
    switch (change) {
        case LinkChange::Opened:
            return "opened";
        case LinkChange::Closed:
            return "closed";
        case LinkChange::Lost:
            return "lost";
        case LinkChange::Reconnected:
            return "reconnected";
        case LinkChange::Applied:
            return "settings applied";
        case LinkChange::Refused:
            return "settings refused";
    }
    return "changed";
}

}  // namespace xtok::host
