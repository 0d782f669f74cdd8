#include "params/text.h"

namespace xtok {

std::string trimmed(const std::string& text) {
    const char* blanks = " \t";
    std::size_t first = text.find_first_not_of(blanks);
    if (first == std::string::npos) {
        return std::string();
    }
    std::size_t last = text.find_last_not_of(blanks);
    return text.substr(first, last - first + 1);
}

void splitTrimmed(const std::string& text, char delimiter, std::vector<std::string>& pieces) {
    std::size_t start = 0;
    for (std::size_t p = text.find(delimiter); p != std::string::npos;
         p = text.find(delimiter, start)) {
        pieces.push_back(trimmed(text.substr(start, p - start)));
        start = p + 1;
    }
    pieces.push_back(trimmed(text.substr(start)));
}

}  // namespace xtok
