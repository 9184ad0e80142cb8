#pragma once
// A locale with a comma for the decimal point and dots between thousands, for tests of what must not depend
// on it.

#include <clocale>
#include <locale>
#include <string>

namespace VLServiceTest {

/// Makes such a locale the process's, for C++ and, where the build could make one, for C, until it is
/// destroyed.
class ForeignLocale {
public:
    ForeignLocale();
    ~ForeignLocale();
    ForeignLocale(ForeignLocale const&) = delete;
    ForeignLocale& operator=(ForeignLocale const&) = delete;

    /// Whether snprintf and its like are foreign too.
    static bool isForeignInC();

private:
    std::string cLocale_;
    std::locale cppLocale_;
};

} // namespace VLServiceTest
