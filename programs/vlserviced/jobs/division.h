#pragma once
// Which of a mailing's letters go by carriers, and a container for the others.

#include "programs/vlserviced/store/letter_store.h"

#include <filesystem>
#include <functional>
#include <string>
#include <vector>

namespace VlServiced {

using HasCarrier = std::function<bool(std::string const& channel)>;

enum class Notifying { No, Yes };

struct Division {
    std::vector<DividedLetter> letters;
    std::vector<Notice> notices;
};

/// The letters of the mailing in a container, each with its channel, the name of its primary address, and who
/// is notified. Where some go by carriers and others do not, `rest` becomes a container of the others. A
/// mailing whose pages are not those that are printed goes as it is: none of its letters is told. Throws
/// Error, and std::system_error when `rest` cannot be written.
Division divide(std::filesystem::path const& container, std::filesystem::path const& rest,
                HasCarrier const& hasCarrier, Notifying notifying = Notifying::No);

} // namespace VlServiced
