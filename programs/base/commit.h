#pragma once

namespace Base {

/// What the program was built from, in seven digits or more; with "+" behind it when files differed. Empty
/// where that is not known. Only programs have it, so that tests are not linked anew with each commit.
extern char const* const COMMIT;

} // namespace Base
