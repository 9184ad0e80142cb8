#include "tests/support/foreign_locale.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <memory>

namespace VLServiceTest {
namespace {

struct CommaForPoint : std::numpunct<char> {
    char do_decimal_point() const override { return ','; }
    char do_thousands_sep() const override { return '.'; }
    std::string do_grouping() const override { return "\3"; }
};

void makeForeign() {
    // The build leaves the folder empty when it cannot make locales.
    setenv("LOCPATH", VLSERVICE_TEST_LOCALES, 1);
    std::setlocale(LC_ALL, "de_DE.UTF-8");
    std::locale::global(std::locale(std::locale::classic(), new CommaForPoint));
}

/// Runs all tests of the executable in the foreign locale when the environment asks for it.
class EverythingForeign : public testing::Environment {
public:
    void SetUp() override {
        if (std::getenv("VLSERVICE_TEST_FOREIGN"))
            locale_ = std::make_unique<ForeignLocale>();
    }
    void TearDown() override { locale_.reset(); }

private:
    std::unique_ptr<ForeignLocale> locale_;
};

auto* const INSTALLED = testing::AddGlobalTestEnvironment(new EverythingForeign);

} // namespace

ForeignLocale::ForeignLocale() : cLocale_(std::setlocale(LC_ALL, nullptr)) { makeForeign(); }

ForeignLocale::~ForeignLocale() {
    std::locale::global(cppLocale_);
    std::setlocale(LC_ALL, cLocale_.c_str());
}

bool ForeignLocale::isForeignInC() { return *std::localeconv()->decimal_point == ','; }

} // namespace VLServiceTest
