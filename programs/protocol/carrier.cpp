#include "programs/protocol/carrier.h"

#include "programs/base/email_address.h"
#include "programs/base/host_port.h"
#include "programs/base/plain_text.h"
#include "programs/base/quoting.h"
#include "programs/base/safe_name.h"
#include "programs/protocol/query.h"
#include "programs/protocol/rows.h"

#include <algorithm>
#include <iterator>
#include <sstream>
#include <string_view>
#include <utility>

namespace Protocol {
namespace {

namespace Schema = Base::Schema;

constexpr char const* TYPE = "type";
constexpr char const* AT_ONCE = "at_once";
constexpr char const* USER = "user";
constexpr char const* PASSWORD_FILE = "password_file";
constexpr char const* ACTION = "action";
constexpr std::size_t MAX_CHANNELS = 16;
constexpr std::size_t MAX_CHANNEL_BYTES = 32;

struct PathForm {
    static bool fits(json::Value const& node) {
        std::string const text = node.textOrEmpty();
        return text.starts_with('/') && Base::isPlainText(text, CarrierSettings::MAX_PATH_BYTES);
    }
    static std::string wanted() { return "an absolute path"; }
    static json::Object schema() { return Schema::textLike("^/"); }
};

struct UnitForm {
    static bool fits(json::Value const& node) {
        return node.textOrEmpty() == "letter" || node.textOrEmpty() == "mailing";
    }
    static std::string wanted() { return "\"letter\" or \"mailing\""; }
    static json::Object schema() { return Schema::words({"letter", "mailing"}); }
};

bool isLetterOrDigit(char c) {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9');
}

bool isMadeOf(std::string_view text, std::string_view others) {
    return std::ranges::all_of(
        text, [&](char c) { return isLetterOrDigit(c) || others.find(c) != std::string_view::npos; });
}

bool isHostWithPort(std::string_view text) {
    return Base::hostPortIn(text) || (text.find(':') == std::string_view::npos && Base::isHost(text));
}

/// A folder of a user on another machine, without a password.
struct SftpUrlForm {
    static constexpr std::string_view SCHEME = "sftp://";

    static bool fits(json::Value const& node) {
        std::string const text = node.textOrEmpty();
        if (!text.starts_with(SCHEME) || text.size() > CarrierSettings::MAX_PATH_BYTES)
            return false;
        std::string_view const rest = std::string_view(text).substr(SCHEME.size());
        std::size_t const at = rest.find('@');
        std::size_t const slash = rest.find('/');
        return at != std::string_view::npos && at > 0 && slash != std::string_view::npos && at < slash &&
               isMadeOf(rest.substr(0, at), "._-") && isHostWithPort(rest.substr(at + 1, slash - at - 1)) &&
               isMadeOf(rest.substr(slash), "/._-~") && rest.ends_with('/');
    }
    static std::string wanted() {
        return "sftp://USER@HOST:PORT/FOLDER/, with letters, digits and \"._-~/\" in the folder";
    }
    static json::Object schema() {
        return Schema::textLike("^sftp://[A-Za-z0-9._-]+@[^/@]+/([A-Za-z0-9/._~-]*/)?$");
    }
};

/// A printer, or a queue of a print server.
struct PrinterUriForm {
    static constexpr std::string_view SCHEME = "ipp://";

    static bool fits(json::Value const& node) {
        std::string const text = node.textOrEmpty();
        if (!text.starts_with(SCHEME) || text.size() > CarrierSettings::MAX_PATH_BYTES)
            return false;
        std::string_view const rest = std::string_view(text).substr(SCHEME.size());
        std::size_t const slash = rest.find('/');
        return slash != std::string_view::npos && isHostWithPort(rest.substr(0, slash)) &&
               isMadeOf(rest.substr(slash), "/._-");
    }
    static std::string wanted() {
        return "ipp://HOST:PORT/PATH, with letters, digits and \"._-/\" in the path";
    }
    static json::Object schema() { return Schema::textLike("^ipp://[^/]+/[A-Za-z0-9/._-]*$"); }
};

/// Of 32 bytes in base64.
struct HostKeyForm {
    static constexpr std::string_view BEGIN = "SHA256:";
    static constexpr std::size_t DIGITS = 43;

    static bool fits(json::Value const& node) {
        std::string const text = node.textOrEmpty();
        return text.starts_with(BEGIN) && text.size() == BEGIN.size() + DIGITS &&
               isMadeOf(std::string_view(text).substr(BEGIN.size()), "+/");
    }
    static std::string wanted() { return "\"SHA256:\" and 43 characters, as ssh-keygen -l prints it"; }
    static json::Object schema() { return Schema::textLike("^SHA256:[A-Za-z0-9+/]{43}$"); }
};

/// The host and port of a server.
struct SmtpUrlForm {
    static bool fits(json::Value const& node) {
        std::string const text = node.textOrEmpty();
        std::size_t const end = text.find("://");
        std::string const scheme = text.substr(0, end);
        return end != text.npos && (scheme == "smtp" || scheme == "smtps") &&
               isHostWithPort(std::string_view(text).substr(end + 3));
    }
    static std::string wanted() { return "smtp://HOST:PORT or smtps://HOST:PORT"; }
    static json::Object schema() { return Schema::textLike("^smtps?://[^/]+$"); }
};

struct AddressForm {
    static bool fits(json::Value const& node) { return Base::isEmailAddress(node.textOrEmpty()); }
    static std::string wanted() { return "one plain address NAME@HOST"; }
    static json::Object schema() { return Schema::textLike("^[^@ ]+@[^@ ]+$"); }
};

/// One line.
struct LineForm {
    static constexpr std::size_t MAX_BYTES = 500;

    static bool fits(json::Value const& node) {
        return node.isString() && Base::isPlainText(node.textOrEmpty(), MAX_BYTES);
    }
    static std::string wanted() { return "a line of at most " + std::to_string(MAX_BYTES) + " bytes"; }
    static json::Object schema() { return Schema::textOfAtMost(MAX_BYTES); }
};

/// A file that only the service may read, or what the system's manager hands over.
struct SecretForm {
    static bool fits(json::Value const& node) {
        std::string const text = node.textOrEmpty();
        return PathForm::fits(node) || (!text.empty() && Base::safeFileName(text) == text);
    }
    static std::string wanted() { return "an absolute path, or the name of a credential"; }
    static json::Object schema() { return Schema::textLike("^(/|[^/.])"); }
};

bool isDigit(char c) { return c >= '0' && c <= '9'; }

/// Of "08:00", in minutes; nothing for what is no time of the day.
std::optional<int> minutesIn(std::string_view text) {
    if (text.size() != 5 || text[2] != ':' || !isDigit(text[0]) || !isDigit(text[1]) || !isDigit(text[3]) ||
        !isDigit(text[4]))
        return std::nullopt;
    int const hours = (text[0] - '0') * 10 + text[1] - '0';
    int const minutes = (text[3] - '0') * 10 + text[4] - '0';
    if (hours > 23 || minutes > 59)
        return std::nullopt;
    return hours * 60 + minutes;
}

std::optional<DayWindow> windowIn(std::string const& text) {
    std::size_t const dash = text.find('-');
    if (dash == std::string::npos)
        return std::nullopt;
    auto const begin = minutesIn(std::string_view(text).substr(0, dash));
    auto const end = minutesIn(std::string_view(text).substr(dash + 1));
    if (!begin || !end || *begin == *end)
        return std::nullopt;
    return DayWindow{*begin, *end};
}

struct HoursForm {
    static bool fits(json::Value const& node) { return windowIn(node.textOrEmpty()).has_value(); }
    static std::string wanted() { return "a window of the day such as \"08:00-18:00\""; }
    static json::Object schema() {
        return Schema::textLike("^([01][0-9]|2[0-3]):[0-5][0-9]-([01][0-9]|2[0-3]):[0-5][0-9]$");
    }
};

} // namespace

struct CarrierSettings::Keys {
    static constexpr long long MAX_RETRY_SECONDS = 3600;
    static constexpr long long MAX_GIVE_UP_HOURS = 24LL * 365;

    /// Those of all types, beside "type".
    static constexpr std::tuple COMMON{
        Asked{"retry_seconds", &CarrierSettings::retrySeconds, IntegerForm{1, MAX_RETRY_SECONDS}, 30LL},
        Asked{"give_up_hours", &CarrierSettings::giveUpHours, IntegerForm{1, MAX_GIVE_UP_HOURS}, 120LL},
        Asked{"per_minute", &CarrierSettings::perMinute, IntegerForm{1, 100'000}},
        Asked{AT_ONCE, &CarrierSettings::atOnce, IntegerForm{1, 16}, 1LL},
        Asked{"hours", &CarrierSettings::hours, HoursForm{}},
    };
    static constexpr std::tuple FOLDER{
        Asked{"folder", &CarrierSettings::folder, PathForm{}},
        Asked{"unit", &CarrierSettings::unit, UnitForm{}, "letter"},
    };
    static constexpr std::tuple SFTP{
        Asked{"url", &CarrierSettings::url, SftpUrlForm{}},
        Asked{"host_key", &CarrierSettings::hostKey, HostKeyForm{}},
        Asked{"identity_file", &CarrierSettings::identityFile, SecretForm{}},
        Asked{"unit", &CarrierSettings::unit, UnitForm{}, "letter"},
    };
    static constexpr std::tuple PRINTER{
        Asked{"uri", &CarrierSettings::uri, PrinterUriForm{}},
        Asked{"unit", &CarrierSettings::unit, UnitForm{}, "letter"},
    };
    static constexpr std::tuple COMMAND{
        Asked{"program", &CarrierSettings::program, PathForm{}},
        Asked{"arguments", &CarrierSettings::arguments, TextsForm{100}},
        Asked{"time_limit", &CarrierSettings::timeLimit, IntegerForm{1, 3600}, 60LL},
        Asked{"output_limit", &CarrierSettings::outputLimit, IntegerForm{1, 1 << 20}, 65'536LL},
        Asked{"user", &CarrierSettings::user, TextForm{}},
        Asked{"text", &CarrierSettings::text, TextForm{}},
    };
    static constexpr std::tuple SMTP{
        Asked{"url", &CarrierSettings::url, SmtpUrlForm{}},
        Asked{"starttls", &CarrierSettings::startsTls, FlagForm{}, true},
        Asked{"ca_file", &CarrierSettings::caFile, PathForm{}},
        Asked{USER, &CarrierSettings::user, LineForm{}},
        Asked{PASSWORD_FILE, &CarrierSettings::passwordFile, SecretForm{}},
        Asked{"from", &CarrierSettings::from, AddressForm{}},
        Asked{"from_name", &CarrierSettings::fromName, LineForm{}},
        Asked{"to", &CarrierSettings::to, LineForm{}},
        Asked{"subject", &CarrierSettings::subject, LineForm{}},
        Asked{"text", &CarrierSettings::text, TextForm{}},
    };
};

namespace {

/// What settings of a type may have, and must.
struct TypeRow {
    CarrierType type;
    char const* name;
    void (*read)(json::Object const&, CarrierSettings&);
    bool (*hasKey)(std::string const&);
    void (*describe)(Schema::Members&);
    /// Separated by blanks.
    char const* required;
};

template<auto const& TABLE>
void readTable(json::Object const& from, CarrierSettings& into) {
    json::readKeys(CarrierSettings::Keys::COMMON, from, into);
    json::readKeys(TABLE, from, into);
}

template<auto const& TABLE>
bool tableHasKey(std::string const& key) {
    return key == TYPE || hasKey(CarrierSettings::Keys::COMMON, key) || hasKey(TABLE, key);
}

template<auto const& TABLE>
void describeTables(Schema::Members& into) {
    describeTable(CarrierSettings::Keys::COMMON, into);
    describeTable(TABLE, into);
}

template<auto const& TABLE>
constexpr TypeRow typeRow(CarrierType type, char const* name, char const* required) {
    return {type, name, &readTable<TABLE>, &tableHasKey<TABLE>, &describeTables<TABLE>, required};
}

constexpr TypeRow TYPES[] = {
    typeRow<CarrierSettings::Keys::FOLDER>(CarrierType::Folder, "folder", "folder"),
    typeRow<CarrierSettings::Keys::SFTP>(CarrierType::Sftp, "sftp", "url host_key identity_file"),
    typeRow<CarrierSettings::Keys::PRINTER>(CarrierType::Printer, "printer", "uri"),
    typeRow<CarrierSettings::Keys::COMMAND>(CarrierType::Command, "command", "program"),
    typeRow<CarrierSettings::Keys::SMTP>(CarrierType::Smtp, "smtp", "url from subject"),
};

std::string typeNames() {
    std::string names;
    for (TypeRow const& row : TYPES)
        names += (names.empty() ? "" : ", ") + std::string(row.name);
    return names;
}

TypeRow const& typeRowNamed(std::string const& name) {
    auto const found = std::ranges::find(TYPES, name, &TypeRow::name);
    if (found == std::end(TYPES))
        throw Base::Error(Base::Code::SettingInvalid,
                          "\"type\" of a carrier has to be one of " + typeNames());
    return *found;
}

std::vector<std::string> requiredKeys(TypeRow const& row) {
    std::istringstream words(row.required);
    return {std::istream_iterator<std::string>(words), {}};
}

void requireKeys(json::Object const& object, TypeRow const& row) {
    for (auto const& [key, value] : object)
        if (!row.hasKey(key))
            throw Base::Error(Base::Code::SettingInvalid, "a carrier of the type " + std::string(row.name) +
                                                              " has no key " +
                                                              Base::inQuotes(Base::oneLine(key)));
    for (std::string const& key : requiredKeys(row))
        if (!object.get(key))
            throw Base::Error(Base::Code::SettingInvalid, "a carrier of the type " + std::string(row.name) +
                                                              " needs the key " + Base::inQuotes(key));
    if (row.type == CarrierType::Smtp && !object.get(USER) != !object.get(PASSWORD_FILE))
        throw Base::Error(Base::Code::SettingInvalid,
                          "a carrier of the type smtp has either both of \"user\" and \"password_file\" or "
                          "none");
}

/// With the rules that hold between keys, as requireKeys() and the constructor test them.
json::Object schemaOf(TypeRow const& row) {
    Schema::Members members(Schema::Members::Others::Refused);
    members.require(TYPE, Schema::constant(row.name));
    row.describe(members);
    if (row.type == CarrierType::Smtp)
        members.needs(USER, PASSWORD_FILE).needs(PASSWORD_FILE, USER);
    if (row.type == CarrierType::Printer)
        members.add(AT_ONCE, Schema::integer(1, 1));
    for (std::string const& key : requiredKeys(row))
        members.require(key);
    return members.schema();
}

CarrierSettings carrierIn(std::string const& channel, json::Value const& value) {
    if (!isChannelName(channel))
        throw Base::Error(Base::Code::SettingInvalid,
                          "\"carriers\" has " + Base::inQuotes(Base::oneLine(channel)) +
                              ", which is no name of an address such as postal, email, fax or sms");
    if (!value.isObject())
        throw Base::Error(Base::Code::SettingInvalid, "the carrier of " + channel + " has to be an object");
    try {
        return CarrierSettings(value.toObject());
    } catch (Base::Error const& wrong) {
        throw Base::Error(Base::Code::SettingInvalid, "the carrier of " + channel + ": " + wrong.what());
    }
}

constexpr std::pair<CarrierAction, char const*> ACTIONS[] = {
    {CarrierAction::Test, "test"},
    {CarrierAction::Pause, "pause"},
    {CarrierAction::Resume, "resume"},
};

} // namespace

struct CarrierReport::Keys {
    static constexpr std::tuple TABLE{
        Always{"channel", &CarrierReport::channel},     Always{"type", &CarrierReport::type},
        Always{"state", &CarrierReport::state},         Always{"says", &CarrierReport::says},
        Always{"since", &CarrierReport::since},         Always{"waiting", &CarrierReport::waiting},
        Always{"uncertain", &CarrierReport::uncertain},
    };
};

struct CarriersAnswer::Keys {
    static constexpr std::tuple TABLE{
        Always{"carriers", &CarriersAnswer::carriers},
    };
};

struct CarrierChange::Keys {
    /// "action" is not among them.
    static constexpr std::tuple TABLE{
        Asked{"channel", &CarrierChange::channel, TextForm{}},
    };
};

struct CarrierTestAnswer::Keys {
    static constexpr std::tuple TABLE{
        Always{"says", &CarrierTestAnswer::says},
    };
};

char const* carrierTypeName(CarrierType type) { return std::ranges::find(TYPES, type, &TypeRow::type)->name; }

CarrierSettings::CarrierSettings(json::Object const& object) {
    TypeRow const& row = typeRowNamed(object.get(TYPE).textOrEmpty());
    requireKeys(object, row);
    type = row.type;
    row.read(object, *this);
    if (keepsOrder() && atOnce > 1)
        throw Base::Error(Base::Code::SettingInvalid,
                          "a carrier of the type " + std::string(row.name) +
                              " has letters one after another, and so no \"at_once\" above 1");
}

std::optional<DayWindow> CarrierSettings::window() const { return windowIn(hours); }

bool isChannelName(std::string const& name) {
    return !name.empty() && name.size() <= MAX_CHANNEL_BYTES && name.front() >= 'a' && name.front() <= 'z' &&
           std::ranges::all_of(name, [](char c) { return (c >= 'a' && c <= 'z') || isDigit(c) || c == '_'; });
}

json::Object channelNameSchema() {
    return Schema::textLike("^[a-z][a-z0-9_]{0," + std::to_string(MAX_CHANNEL_BYTES - 1) + "}$");
}

bool sendsNotices(Carriers const& carriers) {
    auto const found = carriers.find(NOTICE_CHANNEL);
    return found != carriers.end() && found->second.type == CarrierType::Smtp;
}

Carriers carriersIn(json::Object const& object) {
    Carriers carriers;
    for (auto const& [channel, value] : object)
        carriers.emplace(channel, carrierIn(channel, value));
    if (carriers.size() > MAX_CHANNELS)
        throw Base::Error(Base::Code::SettingInvalid,
                          "\"carriers\" has more than " + std::to_string(MAX_CHANNELS) + " channels");
    return carriers;
}

std::vector<CarrierSchema> carrierSchemas() {
    std::vector<CarrierSchema> schemas;
    for (TypeRow const& row : TYPES)
        schemas.push_back({row.name, schemaOf(row)});
    return schemas;
}

json::Object carriersSchema(json::Object const& carrier) {
    json::Object schema = Schema::mapOf(carrier);
    schema.set("propertyNames", channelNameSchema());
    schema.set("maxProperties", MAX_CHANNELS);
    return schema;
}

json::Object CarriersQuery::serialize() { return question(KIND); }

CarrierReport::CarrierReport(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }
json::Object CarrierReport::serialize() const { return writeRecord(*this); }

CarriersAnswer::CarriersAnswer(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }
json::Object CarriersAnswer::serialize() const { return writeRecord(*this); }

char const* carrierActionName(CarrierAction action) {
    return std::ranges::find(ACTIONS, action, &std::pair<CarrierAction, char const*>::first)->second;
}

CarrierChange::CarrierChange(CarrierAction wanted, std::string ofChannel)
    : action(wanted), channel(std::move(ofChannel)) {}

CarrierChange::CarrierChange(json::Object const& object) {
    json::readKeys(Keys::TABLE, object, *this);
    std::string const name = object.get(ACTION).textOrEmpty();
    auto const found = std::ranges::find_if(ACTIONS, [&](auto const& row) { return row.second == name; });
    if (found == std::end(ACTIONS))
        throw Base::Error(Base::Code::RequestInvalid,
                          "\"action\" of a change of a carrier has to be \"test\", \"pause\" or \"resume\"");
    action = found->first;
}

json::Object CarrierChange::serialize() const {
    json::Object object = question(KIND);
    object.set(ACTION, carrierActionName(action));
    json::writeKeys(Keys::TABLE, *this, object);
    return object;
}

CarrierTestAnswer::CarrierTestAnswer(json::Object const& object) {
    json::readKeys(Keys::TABLE, object, *this);
}
json::Object CarrierTestAnswer::serialize() const { return writeRecord(*this); }

} // namespace Protocol
