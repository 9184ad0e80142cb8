#pragma once
// Carriers as client and service speak of them: the settings of each channel's, how it is doing, and what is
// asked of it.

#include "vlservice/json/json.h"

#include <map>
#include <optional>
#include <string>
#include <vector>

namespace Protocol {

enum class CarrierType {
    /// Files in a folder that a print shop takes them from.
    Folder,
    /// The same in a folder of another machine.
    Sftp,
    /// Jobs of a printer.
    Printer,
    /// A program that is run for each letter.
    Command,
    /// E-mails, given to a server.
    Smtp,
};

/// The name that settings have for it.
char const* carrierTypeName(CarrierType type);

/// What becomes one file, or one job of a printer.
enum class CarrierUnit { Letter, Mailing };

/// Minutes of the day, the begin within and the end outside; an end that is not behind the begin is one of
/// the next day.
struct DayWindow {
    int begin = 0;
    int end = 0;
};

/// The settings of a carrier: those that all have, and those of its type.
struct CarrierSettings {
    static constexpr char const* IN_WORDS = "a carrier";
    static constexpr std::size_t MAX_PATH_BYTES = 1000;

    CarrierType type = CarrierType::Folder;
    /// The first pause behind an attempt that failed; each further one is twice as long, up to an hour.
    long long retrySeconds = 30;
    /// Behind the first attempt.
    long long giveUpHours = 120;
    /// Letters that are handed over within a minute at most; 0 is no limit.
    long long perMinute = 0;
    /// Letters that are handed over side by side.
    long long atOnce = 1;
    /// "08:00-18:00", on the service's clock; empty for all day.
    std::string hours;

    std::string folder;
    /// Which of all folders of that name it is, as the service has it on record; no key.
    std::string folderIdentity;
    /// Where the other side is.
    std::string url;
    /// Of a printer.
    std::string uri;
    /// "SHA256:...": the only one that the other side may have.
    std::string hostKey;
    /// An absolute path, or the name of a credential.
    std::string identityFile;
    /// "letter" or "mailing".
    std::string unit = "letter";

    /// An absolute path.
    std::string program;
    /// With placeholders.
    std::vector<std::string> arguments;
    /// In seconds.
    long long timeLimit = 60;
    /// In bytes.
    long long outputLimit = 65'536;
    /// That the program runs as, empty for the service's; or that a server knows.
    std::string user;
    /// What the program reads in place of the document, or what an e-mail says; with placeholders.
    std::string text;

    /// Whether a server of smtp:// has to change over to TLS.
    bool startsTls = true;
    /// Of certificates that a server's may be signed with; empty for the system's.
    std::string caFile;
    /// An absolute path, or the name of a credential; together with `user`.
    std::string passwordFile;
    /// A plain address, and whose it is.
    std::string from;
    std::string fromName;
    /// With placeholders; empty for the letter's address.
    std::string to;
    /// With placeholders.
    std::string subject;

    CarrierSettings() = default;
    /// Throws Error on a type that there is not, an unknown key, one that is missing, and a bad value.
    explicit CarrierSettings(json::Object const& object);

    CarrierUnit unitOfFiles() const { return unit == "mailing" ? CarrierUnit::Mailing : CarrierUnit::Letter; }
    /// Whether recipients get files rather than paper.
    bool sendsFiles() const { return type == CarrierType::Smtp; }
    /// Whether the other side can be asked what became of letters.
    bool canBeAsked() const { return type == CarrierType::Printer; }
    /// Whether a letter waits for those before it in its mailing.
    bool keepsOrder() const { return type == CarrierType::Printer; }
    /// When letters may be handed over; nothing when that is all day.
    std::optional<DayWindow> window() const;

    bool operator==(CarrierSettings const&) const = default;

    struct Keys;
};

/// By the channel's name.
using Carriers = std::map<std::string, CarrierSettings>;

/// Whether a carrier may be of a channel of that name: lower case letters, digits and "_", a letter in front.
bool isChannelName(std::string const& name);
json::Object channelNameSchema();

/// The channel by whose carrier people are told of mailings, when it sends e-mails.
inline constexpr char const* NOTICE_CHANNEL = "email";
/// Whether there is such a carrier.
bool sendsNotices(Carriers const& carriers);

/// The value of the service's setting "carriers". Throws Error, which names the channel.
Carriers carriersIn(json::Object const& object);

/// What the settings of a type may be, as a JSON schema.
struct CarrierSchema {
    char const* type;
    json::Object schema;
};
std::vector<CarrierSchema> carrierSchemas();
/// Of the value of "carriers", with that of one of them.
json::Object carriersSchema(json::Object const& carrier);

/// Asks how the carriers are doing.
struct CarriersQuery {
    static constexpr char const* KIND = "carriers";

    static json::Object serialize();
};

/// How a carrier is doing.
struct CarrierReport {
    std::string channel;
    std::string type;
    /// "working"; "paused" by a person; "failing", when it is tried now and then alone.
    std::string state;
    /// What its last failure was, or what a person wants of it; one line.
    std::string says;
    /// Since when it is in its state, seconds since the epoch; 0 for ever.
    long long since = 0;
    /// Letters by their state.
    long long waiting = 0;
    long long uncertain = 0;

    CarrierReport() = default;
    explicit CarrierReport(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

/// By their channels' names.
struct CarriersAnswer {
    std::vector<CarrierReport> carriers;

    CarriersAnswer() = default;
    explicit CarriersAnswer(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

enum class CarrierAction {
    /// Tries it without sending anything.
    Test,
    Pause,
    Resume,
};

/// "pause"
char const* carrierActionName(CarrierAction action);

/// Asks something of the carrier of one channel.
struct CarrierChange {
    static constexpr char const* KIND = "change_carrier";
    static constexpr char const* IN_WORDS = "a change of a carrier";

    CarrierAction action = CarrierAction::Test;
    std::string channel;

    CarrierChange() = default;
    CarrierChange(CarrierAction wanted, std::string ofChannel);
    /// Throws Error on an action that there is not, and on a wrong type.
    explicit CarrierChange(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

/// The answer to a test: what the other side offers.
struct CarrierTestAnswer {
    std::string says;

    CarrierTestAnswer() = default;
    explicit CarrierTestAnswer(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

} // namespace Protocol
