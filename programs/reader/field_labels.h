#pragma once
// The words in front of values, as the patterns of fields have them.

#include "vlservice/extract/extract_field.h"

#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace Reader {

class FieldLabels {
public:
    void add(Cfg::ExtractField const& field);

    /// Whether the text is one label after the other, of other fields than that: the head of a table, say.
    bool haveAll(std::string_view text, Cfg::ExtractField const& besides) const;

private:
    /// By the field's name, a pattern for the beginning of a text.
    std::vector<std::pair<std::string, std::string>> labels_;
};

} // namespace Reader
