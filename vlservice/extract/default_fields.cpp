#include "vlservice/extract/extract_field.h"

namespace Cfg {

// Lines of the form keyword, colons, value, anywhere in the text; the keyword in any case.

ExtractField const& ExtractField::DefReference() {
    static ExtractField const field(json::Object{
        {"name", "reference"},
        {"value_extract", R"(^(?i:ref):+\h*(?<VAL>\S.*)$)"},
        {"send_to_server", true},
    });
    return field;
}

ExtractField const& ExtractField::DefEmail() {
    static ExtractField const field(json::Object{
        {"name", "email"},
        {"value_extract", R"(^(?i:email):+\h*(?<VAL>.*)$)"},
        {"value_match", R"(\S.*@\S.*\.\S.*)"},
        {"priority", 2},
        {"send_to_server", true},
    });
    return field;
}

ExtractField const& ExtractField::DefFax() {
    static ExtractField const field(json::Object{
        {"name", "fax"},
        {"value_extract", R"(^(?i:fax):+\h*(?<VAL>.*)$)"},
        {"value_match", R"(\S.*)"},
        {"priority", 3},
        {"send_to_server", true},
    });
    return field;
}

ExtractField const& ExtractField::DefSms() {
    static ExtractField const field(json::Object{
        {"name", "sms"},
        {"value_extract", R"(^(?i:sms):+\h*(?<VAL>.*)$)"},
        {"value_match", R"(\S.*)"},
        {"priority", 4},
        {"send_to_server", true},
    });
    return field;
}

// The whole zone. More lines are cut out than are valid, so that an address that is too short or too long is
// seen as invalid and stops its letter, instead of being missed.
ExtractField const& ExtractField::DefPostal() {
    static ExtractField const field(json::Object{
        {"name", "postal"},
        {"value_extract", R"(\A(?<VAL>(.{1,72}\n){0,8}.{1,72})\Z)"},
        {"value_match", R"((.{1,72}(\n|$)){2,7})"},
        {"priority", 1},
        {"width", 14000},
        {"send_to_server", true},
    });
    return field;
}

} // namespace Cfg
