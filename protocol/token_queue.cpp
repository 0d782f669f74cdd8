#include "protocol/token_queue.h"

#include "protocol/hex_text.h"

namespace xtok {

void TokenQueue::push(const char* bytes, std::size_t length, int32_t limit, bool hex) {
    if (static_cast<int64_t>(tokens_.size()) >= limit) {
        removeHead();
    }
    if (hex) {
        tokens_.push_back(bytesToHexText(bytes, length));
    } else {
        tokens_.emplace_back(bytes, length);
    }
}

}  // namespace xtok
