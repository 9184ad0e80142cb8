#pragma once
// A letter as the texts of its zones, written by hand, to test fields without a document:
//
//     [_Address]
//     Jane Roe
//     12 Long Street
//     [Total]
//     Total: 1,234.50

#include "programs/vlmail/letters/preset_index.h"
#include "programs/vlmail/letters/reading.h"

#include <filesystem>
#include <string>

namespace VlMail {

/// Reads the letter as a document of that name would be; zones that the text leaves out have no fields.
/// Throws Error, without the name of the file, when the text is not such a letter or the presets fail.
DocumentReading readZonesText(std::string const& text, std::string const& documentName,
                              PresetIndex const& presets);

/// The same of a file, under the name of it that is without its ending.
DocumentReading readZonesFile(std::filesystem::path const& file, PresetIndex const& presets);

} // namespace VlMail
