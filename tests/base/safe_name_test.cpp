#include "programs/base/safe_name.h"

#include <gtest/gtest.h>

namespace {

TEST(SafeFileName, KeepsAFileInsideItsFolder) {
    struct {
        char const* what;
        std::string name;
        std::string safe;
    } const cases[] = {
        {"an ordinary name", "Rechnung_Müller & Söhne.pdf", "Rechnung_Müller & Söhne.pdf"},
        {"Greek", "Επιστολή 4.pdf", "Επιστολή 4.pdf"},
        {"nothing", "", "_"},
        {"the folder itself", ".", "_"},
        {"the folder above", "..", "_."},
        {"a way up", "../../etc/passwd", "_._.._etc_passwd"},
        {"an absolute path", "/etc/passwd", "_etc_passwd"},
        {"a path of another system", "C:\\temp\\x", "C__temp_x"},
        {"a hidden file", ".bashrc", "_bashrc"},
        {"a leading blank", " x", "_x"},
        {"a line break", "a\nb\rc", "a_b_c"},
        {"an embedded zero", std::string("a\0b", 3), "a_b"},
        {"a control character beyond ASCII", "a\xC2\x85z", "a_z"},
        {"broken UTF-8", "a\xFFz\xC3", "a_z_"},
        {"an overlong zero", "a\xE0\x80\x80z", "a___z"},
        {"half a pair of UTF-16", "a\xED\xA0\x80z", "a___z"},
        {"an overlong character of four bytes", "a\xF0\x80\x80\x80z", "a____z"},
        {"a character beyond the last", "a\xF4\x90\x80\x80z", "a____z"},
    };
    for (auto const& c : cases)
        EXPECT_EQ(Base::safeFileName(c.name), c.safe) << c.what;
}

TEST(SafeFileName, CutsLongNamesBetweenCharacters) {
    std::string name;
    for (int i = 0; i < 150; ++i)
        name += "ü";
    EXPECT_EQ(Base::safeFileName(name), name.substr(0, 200));
    EXPECT_EQ(Base::safeFileName("a" + name), "a" + name.substr(0, 198));
}

} // namespace
