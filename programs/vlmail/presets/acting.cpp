#include "programs/vlmail/presets/acting.h"

#include "vlservice/cfg/app.h"
#include "vlservice/cfg/departments.h"
#include "vlservice/cfg/inet.h"
#include "vlservice/cfg/po.h"
#include "vlservice/cfg/profiles.h"
#include "vlservice/presets/presets.h"

#include <algorithm>

namespace VlMail {
namespace {

using enum Actor;

// The settings of a node.
constexpr ActingRow APP[] = {
    {"show_ctrls", Nobody},
    {"priority_delivery", ClientAndService},
    {"db_name", Client},
    {"db_host", Client},
    {"print_area", Client},
    {"descr", Client},
    {"dep_alias", Nobody},
    {"auto_save_preset", Nobody},
    {"max_letter_sheets", ClientAndService},
    {"enfoce_dep", ClientAndService},
    {"enforce_po", ClientAndService},
    {"enforce_profile", ClientAndService},
    {"loose_letter_deviation", Client},
    {"debug_view", Nobody},
    {"m", Nobody},
};
constexpr ActingRow INET[] = {
    {"help_url", Nobody},
    {"contact_url", Nobody},
    {"status_update_hours", Service},
    {"submitted_alarm_hours", Service},
    {"lodged_alarm_hours", Service},
    {"wizard_image", Nobody},
};
constexpr ActingRow PO[] = {
    {"code", ClientAndService},
    {"expiry", ClientAndService},
};
constexpr ActingRow LIST[] = {
    {"vals", ClientAndService},
};

// How documents are read. The library does what its own values say, the reader what pages are needed for.
constexpr ActingRow EXTRACT_PRESET[] = {
    {"match", Library},
    {"order", Library},
    {"erase_me", Library},
    {"pack_preset", Library},
    {"name", Client},
    {"type", Client},
    {"use_only_fields", Reader},
    {"ocr_mode", Nobody},
    {"ocr_test_pages", Nobody},
    {"tet_granularity", Nobody},
    {"space_adjust_perc", Reader},
    {"no_spaces_in_frags", Reader},
    {"trim_frags", Reader},
    {"skip_images", Reader},
    {"signature_adjust", Nobody},
    {"retry_on_repeated", Nobody},
    {"skip_first_page", Reader},
    {"last_used", Service},
    {"max_spaces_between_fragments", Reader},
    {"max_line_distance", Reader},
    {"zones", Reader},
};
constexpr ActingRow ZONE[] = {
    {"name", Client},           {"fields", Reader},
    {"location", Reader},       {"most_probable_point", Reader},
    {"combine_blocks", Nobody}, {"restrict_to_location", Nobody},
};
constexpr ActingRow FIELD[] = {
    {"name", Library},
    {"value_extract", Library},
    {"mark", Reader},
    {"ignore_font_metrics", Reader},
    {"priority", Library},
    {"obligatory", Reader},
    {"make_one_line", Library},
    {"send_to_server", Library},
    {"width", Reader},
    {"ignore_on_group", Library},
    {"name_is_redirect_match", Nobody},
    {"postal_match", Nobody},
    {"value_match", Library},
    {"value_type", Library},
    {"value_min", Library},
    {"value_max", Library},
    {"default_value", Library},
};

// How letters are sent.
constexpr ActingRow PACK_PRESET[] = {
    {"name", Library},
    {"erase_me", Library},
    {"title", Client},
    {"colour_model", Client},
    {"duplex", Client},
    {"orientation", Client},
    {"department", ClientAndService},
    {"no_group", Client},
    {"process_mode", Service},
    {"process_mode_client", Nobody},
    {"profile", ClientAndService},
    {"priority_delivery", ClientAndService},
    {"confirmation_email", ClientAndService},
    {"customer_email", ClientAndService},
    {"lock_pack_ui", Service},
    {"last_used", Service},
    {"delay", ClientAndService},
    {"attachments", Client},
    {"letterheads", Client},
};
constexpr ActingRow DELAY[] = {
    {"count", Service},
    {"week_days", Service},
    {"month_days", Service},
    {"mins", Service},
};
constexpr ActingRow ATTACHMENT[] = {
    {"id", Client},
    {"preferred_pos", Client},
};
constexpr ActingRow LETTERHEAD[] = {
    {"id", Client},
    {"skip_letters", Client},
    {"skip_attachments", Client},
    {"repeat_last_page", Client},
    {"apply_first_grouped_only", Client},
    {"on_top", Client},
    {"which_attachments", Client},
};

constexpr ActingRecord RECORDS[] = {
    {Cfg::App::keys, APP},
    {Cfg::Inet::keys, INET},
    {Cfg::PO::keys, PO},
    {Cfg::Departments::keys, LIST},
    {Cfg::Profiles::keys, LIST},
    {Cfg::ExtractPreset::keys, EXTRACT_PRESET},
    {Cfg::ExtractZone::keys, ZONE},
    {Cfg::ExtractField::keys, FIELD},
    {Cfg::PackPreset::keys, PACK_PRESET},
    {Cfg::PackPreset::DelayInfo::keys, DELAY},
    {Cfg::PackPreset::Attachment::keys, ATTACHMENT},
    {Cfg::LetterheadInf::keys, LETTERHEAD},
};

} // namespace

std::span<ActingRecord const> actingRecords() { return RECORDS; }

bool isCarriedOnly(json::RecordKeys const& record, std::string_view key) {
    auto const table =
        std::ranges::find_if(RECORDS, [&](ActingRecord const& each) { return &each.keys() == &record; });
    return table != std::end(RECORDS) && std::ranges::any_of(table->rows, [&](ActingRow const& row) {
               return row.key == key && row.actor == Nobody;
           });
}

char const* inWords(Actor actor) {
    switch (actor) {
    case Library:
        return "library";
    case Reader:
        return "reader";
    case Client:
        return "client";
    case Service:
        return "service";
    case ClientAndService:
        return "client and service";
    case Nobody:
        break;
    }
    return "nobody: `carried-only`";
}

} // namespace VlMail
