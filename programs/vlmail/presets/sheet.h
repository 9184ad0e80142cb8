#pragma once
// The sheets that letters are printed on.

namespace VlMail {

// Of A4 and Letter the wider and the higher one, upright, in 1/100 mm.

constexpr int UPRIGHT_WIDTH = 21590;
constexpr int UPRIGHT_HEIGHT = 29700;

} // namespace VlMail
