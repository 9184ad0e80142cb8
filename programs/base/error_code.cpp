#include "programs/base/error_code.h"

#include <algorithm>
#include <array>

namespace Base {
namespace {

constexpr std::array ROWS{
    CodeRow{Code::Usage, "usage", "The command line or what stands in a file of options is wrong"},
    CodeRow{Code::FileUnreadable, "file-unreadable", "A file or folder is not there, or may not be read"},
    CodeRow{Code::FileUnwritable, "file-unwritable",
            "A file or folder cannot be written: there is no room, or no right to"},
    CodeRow{Code::FileUnsuitable, "file-unsuitable",
            "What the path names is no file of the kind that is wanted: a folder, a device, a file that is "
            "too large"},
    CodeRow{Code::FileExists, "file-exists",
            "There is a file of that name already, and nothing is written over"},
    CodeRow{Code::FileNotPrivate, "file-not-private",
            "A file with a secret is open to others, or belongs to another user"},
    CodeRow{Code::WrongFolder, "wrong-folder",
            "A folder is another one than when it was set, a share that is not mounted say"},
    CodeRow{Code::DocumentUnreadable, "document-unreadable",
            "A document is damaged, empty, or of a kind that is not read"},
    CodeRow{Code::DocumentEncrypted, "document-encrypted", "A document is encrypted"},
    CodeRow{Code::DocumentTooLarge, "document-too-large", "A document has more pages or bytes than are read"},
    CodeRow{Code::DocumentChanged, "document-changed", "A document has changed while it was in use"},
    CodeRow{Code::DocumentUnknown, "document-unknown",
            "There is no document of that name: a letterhead or an attachment"},
    CodeRow{Code::FontMissing, "font-missing",
            "A font that texts are set in is not installed, or has no such character"},
    CodeRow{Code::LimitExceeded, "limit-exceeded",
            "Reading took more time or memory than a document may have"},
    CodeRow{Code::OutOfMemory, "out-of-memory", "There is not enough memory"},
    CodeRow{Code::TooLarge, "too-large", "Something is larger than it may be"},
    CodeRow{Code::JsonMalformed, "json-malformed", "A text is no JSON of the form that is wanted"},
    CodeRow{Code::SettingsMalformed, "settings-malformed", "Settings cannot be read as a whole"},
    CodeRow{Code::SettingInvalid, "setting-invalid", "A setting has a value that it cannot have"},
    CodeRow{Code::SettingUnknown, "setting-unknown", "There is no setting or part of that name"},
    CodeRow{Code::SettingMissing, "setting-missing",
            "What was asked for needs a setting that nobody has set"},
    CodeRow{Code::SettingsChanged, "settings-changed",
            "Settings were changed by somebody else since they were read"},
    CodeRow{Code::PatternInvalid, "pattern-invalid", "An expression of a preset cannot be used"},
    CodeRow{Code::PresetMissing, "preset-missing",
            "No preset fits the document, or a pack preset that is named is not there"},
    CodeRow{Code::ExpectationMalformed, "expectation-malformed",
            "What is expected of a test case cannot be used"},
    CodeRow{Code::NodeInvalid, "node-invalid", "A text is no id of a node"},
    CodeRow{Code::NodeUnknown, "node-unknown", "There is no such node"},
    CodeRow{Code::NodeInUse, "node-in-use",
            "A node cannot be removed while others are below it, and the root never"},
    CodeRow{Code::NodeDisabled, "node-disabled", "Nobody may send for the node at the moment"},
    CodeRow{Code::RefusedBySettings, "refused-by-settings",
            "The settings of the node do not allow the mailing"},
    CodeRow{Code::PlanMalformed, "plan-malformed", "A file is no plan of this version, or was edited"},
    CodeRow{Code::PlanOutdated, "plan-outdated", "What a plan was made of has changed since"},
    CodeRow{Code::MailingDamaged, "mailing-damaged", "A mailing, or a part of it, cannot be read"},
    CodeRow{Code::MailingInvalid, "mailing-invalid",
            "A mailing is none that can be sent: it has no pages, or a title that is no line of text"},
    CodeRow{Code::MailingIdInvalid, "mailing-id-invalid", "The id of a mailing cannot name a file"},
    CodeRow{Code::MailingUnknown, "mailing-unknown", "There is no mailing of that id"},
    CodeRow{Code::MailingExists, "mailing-exists", "There is another mailing of that id"},
    CodeRow{Code::LetterUnknown, "letter-unknown", "There is no such letter"},
    CodeRow{Code::LetterUnsuitable, "letter-unsuitable",
            "A letter does not have what its way out needs, a field or an address"},
    CodeRow{Code::StateRefused, "state-refused",
            "It is too late for that, or too early: the mailing or the letter is in another state"},
    CodeRow{Code::SentBefore, "sent-before", "The same letters went out before"},
    CodeRow{Code::QuotaExceeded, "quota-exceeded", "The node has as many packs with the service as it may"},
    CodeRow{Code::CarrierUnknown, "carrier-unknown", "There is no carrier of that channel"},
    CodeRow{Code::CarrierUnavailable, "carrier-unavailable", "A way out cannot be had at the moment"},
    CodeRow{Code::CarrierUnsuitable, "carrier-unsuitable", "A printer or server does not take what is sent"},
    CodeRow{Code::ReportUnreadable, "report-unreadable", "A message is no report of delivery"},
    CodeRow{Code::ServiceNotFound, "service-not-found", "No service answered on the network"},
    CodeRow{Code::ServiceUnreachable, "service-unreachable",
            "The service cannot be reached, or does not answer in time"},
    CodeRow{Code::ConnectionLost, "connection-lost", "The connection broke in the middle"},
    CodeRow{Code::ConnectionBroken, "connection-broken", "The other side does not keep to the protocol"},
    CodeRow{Code::ConnectionRefused, "connection-refused", "The service has closed the connection"},
    CodeRow{Code::VersionMismatch, "version-mismatch",
            "Two programs are of versions that do not go together"},
    CodeRow{Code::ServiceOutdated, "service-outdated",
            "The service does not know what is asked of it, or is not set up for it"},
    CodeRow{Code::CertificateUntrusted, "certificate-untrusted",
            "The certificate of the service is new, or another than before"},
    CodeRow{Code::TlsUnusable, "tls-unusable", "Certificate, key or TLS of this machine cannot be used"},
    CodeRow{Code::TokenInvalid, "token-invalid", "A file holds no access token"},
    CodeRow{Code::TokenRefused, "token-refused", "The service does not know the token, or it was revoked"},
    CodeRow{Code::TokenUnknown, "token-unknown", "There is no token of that name"},
    CodeRow{Code::TokenNeeded, "token-needed", "A token that the service cannot do without is not revoked"},
    CodeRow{Code::NameInvalid, "name-invalid", "A name has characters that it cannot have, or too many"},
    CodeRow{Code::NameTaken, "name-taken", "Something else has that name"},
    CodeRow{Code::NotAllowed, "not-allowed", "The token does not allow it"},
    CodeRow{Code::RequestInvalid, "request-invalid",
            "A program asks the service for something that cannot be"},
    CodeRow{Code::Superseded, "superseded", "Something newer was asked for before the answer was there"},
    CodeRow{Code::ServiceRefused, "service-refused", "The service refuses, and gives no code for it"},
    CodeRow{Code::ServiceSuspended, "service-suspended",
            "The service holds changes or jobs back for the time being"},
    CodeRow{Code::ServiceTrouble, "service-trouble", "The service has the mailing and cannot go on with it"},
    CodeRow{Code::AddressUnusable, "address-unusable", "The service cannot listen on that address"},
    CodeRow{Code::DataFolderUnusable, "data-folder-unusable",
            "The data folder of the service cannot be used"},
    CodeRow{Code::DataFolderBusy, "data-folder-busy", "Another service uses the data folder"},
    CodeRow{Code::LeaseLost, "lease-lost", "Another service has gone on with the letter"},
    CodeRow{Code::DatabaseMissing, "database-missing", "There is no such database file"},
    CodeRow{Code::DatabaseUnusable, "database-unusable",
            "A file is no database of the kind that is wanted, or others may write it"},
    CodeRow{Code::DatabaseUnavailable, "database-unavailable", "A database cannot be opened or reached"},
    CodeRow{Code::DatabaseBusy, "database-busy", "Another program holds the database"},
    CodeRow{Code::DatabaseDamaged, "database-damaged", "A database is damaged"},
    CodeRow{Code::DatabaseNewer, "database-newer", "A newer version has written the database"},
    CodeRow{Code::DatabaseFailed, "database-failed", "A database refuses a statement: its disk is full, say"},
    CodeRow{Code::ProgramLimited, "program-limited", "A library of this machine cannot do what is wanted"},
    CodeRow{Code::SystemFailed, "system-failed", "The system refuses a call"},
    CodeRow{Code::Unexpected, "unexpected", "Something failed in a way that has no code of its own"},
};

static_assert(ROWS.size() == static_cast<std::size_t>(Code::COUNT_));
static_assert(std::ranges::is_sorted(ROWS, {}, &CodeRow::code));

} // namespace

std::vector<CodeRow> codes() { return {ROWS.begin(), ROWS.end()}; }

char const* nameOf(Code code) { return ROWS.at(static_cast<std::size_t>(code)).name; }

std::optional<Code> codeNamed(std::string_view name) {
    auto const row = std::ranges::find_if(ROWS, [&](CodeRow const& one) { return one.name == name; });
    return row == ROWS.end() ? std::nullopt : std::optional(row->code);
}

} // namespace Base
