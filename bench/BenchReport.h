// The one line format every benchmark prints for scripts/bench.sh, which gathers the lines into one
// table and judges each ratio against its goal:
//
//   ROW|<id>|<figure>|<figure value>|<reference>|<reference value>|<ratio>|<goal>
//
// The goal is "<= x" or ">= x"; a figure that could not be measured prints "not measured: <why>"
// in place of the ratio and "-" in the other value fields.
#pragma once

#include <cstdio>

namespace bench {

inline void Row(const char* id, const char* figure, const char* figureValue, const char* reference,
                const char* referenceValue, double ratio, const char* goal) {
    std::printf("ROW|%s|%s|%s|%s|%s|%.2f|%s\n", id, figure, figureValue, reference, referenceValue, ratio, goal);
    std::fflush(stdout);
}

inline void NotMeasured(const char* id, const char* figure, const char* reference, const char* why, const char* goal) {
    std::printf("ROW|%s|%s|-|%s|-|not measured: %s|%s\n", id, figure, reference, why, goal);
    std::fflush(stdout);
}

}  // namespace bench
