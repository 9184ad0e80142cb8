#pragma once
// A library that a program of the tests loads late: what calls can hand over and bring back.

#include <array>
#include <string>

#define LATE_SAMPLE __attribute__((visibility("default")))

namespace LateSample {

struct Row {
    std::array<long, 9> numbers;
};

LATE_SAMPLE void touch();
/// More than fit into registers.
LATE_SAMPLE Row rowOf(long a, long b, long c, long d, long e, long f, long g, long h, long i);
LATE_SAMPLE double weighed(double a, double b, double c, double d, double e, double f, double g, double h,
                           double i, int weight);
/// As printf has them.
LATE_SAMPLE std::string written(char const* format, ...);
/// Throws std::out_of_range with the words.
LATE_SAMPLE void refuse(std::string const& words);
LATE_SAMPLE int twice(int number);

} // namespace LateSample

namespace LateNowhere {

/// Of a library that is on no machine.
LATE_SAMPLE int anything();

} // namespace LateNowhere
