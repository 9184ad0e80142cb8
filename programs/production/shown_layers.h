#pragma once
// Which layers of a page are shown, where it is laid on one of another document. Without anything that needs
// C++20, as qpdf's headers have it.

#include <qpdf/QPDF.hh>

namespace Production {

/// Adds what the catalog of `laid` says of its layers to that of `on`. What of them is hidden stays hidden.
void showLayersOf(QPDF& laid, QPDF& on);

} // namespace Production
