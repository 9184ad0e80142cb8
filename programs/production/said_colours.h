#pragma once
// Whether a page may have colour, by what its contents say: most pages are black on white, and telling so
// costs a tenth of drawing them. Without anything that needs C++20, as qpdf's headers have it.

#include <string>

namespace Production {

/// Of a PDF of one page. False only where nothing on it can have another colour than a shade of grey; what is
/// not looked into may have one. Throws nothing derived from std::exception.
bool maySayColour(std::string const& pdf);

} // namespace Production
