#pragma once
// Lengths as people read them.

#include <string>

namespace Base {

/// 1/100 mm as millimetres with as many decimals as it has: "95", "95.5", "-0.01".
std::string inMillimetres(long long hundredths);

/// The same with the unit: "95.5 mm".
std::string withMillimetres(long long hundredths);

} // namespace Base
