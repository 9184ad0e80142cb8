#include "programs/vlmail/presets/keys.h"

#include <algorithm>
#include <cctype>
#include <numeric>
#include <vector>

namespace VlMail {
namespace {

using enum KeyType;
using enum KeyUse;

constexpr KeyRow RECT_ROWS[] = {{"left", Int32}, {"top", Int32}, {"right", Int32}, {"bottom", Int32}};
constexpr RecordKeys RECT{RECT_ROWS};

constexpr KeyRow POINT_ROWS[] = {{"x", Int32}, {"y", Int32}};
constexpr RecordKeys POINT{POINT_ROWS};

constexpr KeyRow FIELD_ROWS[] = {
    {"name", Text, Required},
    {"value_extract", Text},
    {"mark", Int32},
    {"ignore_font_metrics", Flag},
    {"priority", Int32},
    {"obligatory", Flag},
    {"make_one_line", Flag},
    {"send_to_server", Flag},
    {"width", UInt64},
    {"ignore_on_group", Int32},
    {"name_is_redirect_match", Flag},
    {"postal_match", Int32},
    {"value_type", Int32},
    {"value_match", Text},
    // What limits and defaults may be depends on the type of the value.
    {"value_min", Any},
    {"value_max", Any},
    {"default_value", Any},
};
constexpr RecordKeys FIELD{FIELD_ROWS};

constexpr KeyRow ZONE_ROWS[] = {
    {"name", Text, Required},
    {"fields", Records, Required, &FIELD},
    {"location", Record, Checked, &RECT},
    {"most_probable_point", Record, Checked, &POINT},
    {"combine_blocks", Int32},
    {"restrict_to_location", Int32},
};
constexpr RecordKeys ZONE{ZONE_ROWS};

constexpr KeyRow EXTRACT_PRESET_ROWS[] = {
    {"match", Text},
    {"order", Int32},
    {"erase_me", Flag},
    {"pack_preset", Text},
    {"name", Text},
    {"type", Int32},
    {"use_only_fields", Flag},
    {"ocr_mode", Int32},
    {"ocr_test_pages", UInt32},
    {"tet_granularity", Int32},
    {"space_adjust_perc", Int32},
    {"no_spaces_in_frags", Flag},
    {"trim_frags", Flag},
    {"skip_images", Flag},
    {"signature_adjust", Int32},
    {"retry_on_repeated", UInt32},
    {"skip_first_page", Flag},
    {"last_used", Int64},
    {"max_spaces_between_fragments", Number, Lenient, nullptr, "3.0"},
    {"max_line_distance", Number, Lenient, nullptr, "1.8"},
    {"zones", Records, Checked, &ZONE},
};
constexpr RecordKeys EXTRACT_PRESET{.rows = EXTRACT_PRESET_ROWS, .mayBeWrapped = true};

constexpr KeyRow ATTACHMENT_ROWS[] = {
    {"id", Text, Required},     {"preferred_pos", Int32, Checked}, {"pdf_file_name", Any, Dropped},
    {"doc_name", Any, Dropped}, {"is_letter", Any, Dropped},
};
constexpr RecordKeys ATTACHMENT{.rows = ATTACHMENT_ROWS, .keepsOthers = true, .mayBeText = true};

constexpr KeyRow LETTERHEAD_ROWS[] = {
    {"id", Text, Required},
    {"skip_letters", Flag},
    {"skip_attachments", Flag},
    {"repeat_last_page", Flag},
    {"apply_first_grouped_only", Flag},
    {"on_top", Flag},
    {"which_attachments", Texts, Checked},
    {"file_name", Any, Dropped},
    {"pdf_file_name", Any, Dropped},
};
constexpr RecordKeys LETTERHEAD{.rows = LETTERHEAD_ROWS, .keepsOthers = true, .mayBeText = true};

constexpr KeyRow DELAY_ROWS[] = {
    {"count", Int32},
    {"week_days", Numbers, Checked},
    {"month_days", Numbers, Checked},
    {"mins", Numbers, Checked},
};
constexpr RecordKeys DELAY{DELAY_ROWS};

constexpr KeyRow PACK_PRESET_ROWS[] = {
    {"name", Text, Required},
    {"title", Text},
    {"colour_model", Int32},
    {"duplex", Flag},
    {"orientation", Int32},
    {"department", Text},
    {"no_group", Flag},
    {"process_mode", Int64},
    {"process_mode_client", Int64},
    {"profile", Text},
    {"priority_delivery", Flag},
    {"confirmation_email", Flag},
    {"customer_email", Text},
    {"lock_pack_ui", Flag},
    {"delay", Record, Checked, &DELAY},
    {"attachments", Records, Checked, &ATTACHMENT},
    {"letterheads", Records, Checked, &LETTERHEAD},
    {"last_used", Int64},
    {"erase_me", Flag},
    // Looked at by checkReadingRules.
    {"reading", Any},
    {"purchase_order", Any, Dropped},
    {"add_docs", Any, Dropped},
    {"account", Any, Dropped},
    {"user", Any, Dropped},
    {"_id", Any, Dropped},
    {"draft", Any, Dropped},
    {"version", Any, Dropped},
    {"covert", Any, Dropped},
};
constexpr RecordKeys PACK_PRESET{.rows = PACK_PRESET_ROWS, .keepsOthers = true, .mayBeWrapped = true};

constexpr KeyRow PRESETS_ROWS[] = {
    {"extract_presets", Records, Checked, &EXTRACT_PRESET},
    {"pack_presets", Records, Checked, &PACK_PRESET},
};

constexpr KeyRow APP_ROWS[] = {
    {"show_ctrls", Numbers, Checked},
    {"priority_delivery", Int32, Checked},
    {"db_name", Text, Checked},
    {"db_host", Text, Checked},
    {"print_area", Record, Checked, &RECT},
    {"descr", Text, Checked},
    {"dep_alias", Text, Checked},
    {"auto_save_preset", Flag, Checked},
    {"max_letter_sheets", Int32, Checked},
    // Spelt so in every stored document.
    {"enfoce_dep", Flag, Checked},
    {"enforce_po", Flag, Checked},
    {"enforce_profile", Flag, Checked},
    {"loose_letter_deviation", Flag, Checked},
    {"debug_view", Int32, Checked},
    {"m", Int32, Checked},
};
constexpr RecordKeys APP{.rows = APP_ROWS, .wrapsValues = true};

constexpr KeyRow INET_ROWS[] = {
    {"help_url", Text, Checked},
    {"contact_url", Text, Checked},
    {"status_update_hours", Int32, Checked},
    {"submitted_alarm_hours", Int32, Checked},
    {"lodged_alarm_hours", Int32, Checked},
    {"wizard_image", Text, Checked},
};
constexpr RecordKeys INET{.rows = INET_ROWS, .wrapsValues = true};

constexpr KeyRow PO_ROWS[] = {{"code", Text, Checked}, {"expiry", Int64, Checked}};
constexpr RecordKeys PO{.rows = PO_ROWS, .wrapsValues = true};

constexpr KeyRow DESCRIBED_ROWS[] = {{"name", Text, Required}, {"descrip", Text}};
constexpr RecordKeys DEPARTMENT{.rows = DESCRIBED_ROWS, .mayBeText = true};
constexpr RecordKeys PROFILE{.rows = DESCRIBED_ROWS, .mayBeWrapped = true};

constexpr KeyRow DEPS_ROWS[] = {{"vals", Records, Checked, &DEPARTMENT}};
constexpr RecordKeys DEPS{.rows = DEPS_ROWS, .wrapsValues = true};

constexpr KeyRow PROFILES_ROWS[] = {{"vals", Records, Checked, &PROFILE}};
constexpr RecordKeys PROFILES{PROFILES_ROWS};

std::string lowered(std::string text) {
    std::transform(text.begin(), text.end(), text.begin(),
                   [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
    return text;
}

/// Insertions, deletions, replacements and exchanges of neighbours that make one text of the other.
std::size_t distance(std::string const& a, std::string const& b) {
    std::vector<std::vector<std::size_t>> steps(a.size() + 1, std::vector<std::size_t>(b.size() + 1));
    for (std::size_t i = 0; i <= a.size(); ++i)
        steps[i][0] = i;
    std::iota(steps[0].begin(), steps[0].end(), std::size_t{0});
    for (std::size_t i = 1; i <= a.size(); ++i) {
        for (std::size_t j = 1; j <= b.size(); ++j) {
            std::size_t const replaced = steps[i - 1][j - 1] + (a[i - 1] == b[j - 1] ? 0 : 1);
            steps[i][j] = std::min({steps[i - 1][j] + 1, steps[i][j - 1] + 1, replaced});
            if (i > 1 && j > 1 && a[i - 1] == b[j - 2] && a[i - 2] == b[j - 1])
                steps[i][j] = std::min(steps[i][j], steps[i - 2][j - 2] + 1);
        }
    }
    return steps[a.size()][b.size()];
}

/// A short name leaves less room for errors than a long one.
std::size_t tolerance(std::string const& name) { return name.size() < 4 ? 1 : name.size() < 8 ? 2 : 3; }

} // namespace

RecordKeys const PRESETS_KEYS{PRESETS_ROWS};

std::span<PartKeys const> partKeys() {
    static constexpr PartKeys PARTS[] = {
        {"presets", &PRESETS_KEYS}, {"app", &APP}, {"inet", &INET}, {"po", &PO}, {"deps", &DEPS},
        {"profiles", &PROFILES},
    };
    return PARTS;
}

std::string nearestName(std::string const& name, std::span<std::string const> candidates) {
    // Longer ones are no misspelling of anything, and the distance costs the product of the lengths.
    constexpr std::size_t MAX_NAME = 100;
    if (name.size() > MAX_NAME)
        return {};
    std::string const wanted = lowered(name);
    std::size_t best = tolerance(name) + 1;
    std::string nearest;
    for (std::string const& candidate : candidates) {
        if (candidate.size() > MAX_NAME)
            continue;
        std::size_t const found = distance(wanted, lowered(candidate));
        if (found < best) {
            best = found;
            nearest = candidate;
        }
    }
    return nearest;
}

} // namespace VlMail
