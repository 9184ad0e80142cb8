#include "tests/base/late/late_sample.h"

#include <cstdarg>
#include <cstdio>
#include <stdexcept>

namespace LateSample {

void touch() {}

Row rowOf(long a, long b, long c, long d, long e, long f, long g, long h, long i) {
    return {{a, b, c, d, e, f, g, h, i}};
}

double weighed(double a, double b, double c, double d, double e, double f, double g, double h, double i,
               int weight) {
    return weight * (a + 10 * b + 100 * c + 1e3 * d + 1e4 * e + 1e5 * f + 1e6 * g + 1e7 * h + 1e8 * i);
}

std::string written(char const* format, ...) {
    std::array<char, 100> text;
    std::va_list arguments;
    va_start(arguments, format);
    std::vsnprintf(text.data(), text.size(), format, arguments);
    va_end(arguments);
    return text.data();
}

void refuse(std::string const& words) { throw std::out_of_range(words); }

int twice(int number) { return 2 * number; }

} // namespace LateSample
