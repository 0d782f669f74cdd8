#include "tools/closest_word.h"

#include <algorithm>
#include <cctype>

namespace xtok::tools {

namespace {

// Words longer than this are no mistyped key; measuring them would only cost.
constexpr std::size_t kLongest = 64;

std::size_t editDistance(const std::string& a, const std::string& b) {
    std::vector<std::size_t> row(b.size() + 1);
    for (std::size_t j = 0; j <= b.size(); ++j) {
        row[j] = j;
    }
    for (std::size_t i = 1; i <= a.size(); ++i) {
        std::size_t diagonal = row[0];
        row[0] = i;
        for (std::size_t j = 1; j <= b.size(); ++j) {
            const bool same = std::tolower(static_cast<unsigned char>(a[i - 1])) ==
                              std::tolower(static_cast<unsigned char>(b[j - 1]));
            const std::size_t next = std::min({row[j] + 1, row[j - 1] + 1, diagonal + !same});
            diagonal = row[j];
            row[j] = next;
        }
    }
    return row[b.size()];
}

}  // namespace

std::string closestWord(const std::string& word, const std::vector<std::string>& candidates) {
    if (word.size() > kLongest) {
        return "";
    }
    // One slip in a short word, up to three in a long one.
    const std::size_t allowed = std::clamp<std::size_t>(word.size() / 3, 1, 3);
    std::string best;
    std::size_t bestDistance = allowed + 1;
    for (const std::string& candidate : candidates) {
        const std::size_t distance = editDistance(word, candidate);
        if (distance < bestDistance) {
            best = candidate;
            bestDistance = distance;
        }
    }
    // A word that begins or ends a key names it well enough: "baud" for
    // "baudrate", "suffix" for "rx_suffix" (the first such key).
    for (std::size_t i = 0; i < candidates.size() && best.empty() && word.size() >= 3; ++i) {
        const std::string& c = candidates[i];
        const bool part =
            c.size() > word.size() && (c.compare(0, word.size(), word) == 0 ||
                                       c.compare(c.size() - word.size(), word.size(), word) == 0);
        best = part ? c : "";
    }
    return best;
}

std::string unknownWord(const char* what, const std::string& word,
                        const std::vector<std::string>& candidates) {
    const std::string closest = closestWord(word, candidates);
    return std::string("unknown ") + what + " '" + word + "'" +
           (closest.empty() ? "" : "; did you mean '" + closest + "'?");
}

}  // namespace xtok::tools
