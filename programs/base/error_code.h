#pragma once
// Codes of failures: stable words by which programs tell them apart, and people find them in docs/errors.md.

#include <optional>
#include <string_view>
#include <vector>

namespace Base {

/// What kind of failure it is, by what somebody has to do about it; its row stands in error_code.cpp, in this
/// order.
enum class Code {
    Usage,
    FileUnreadable,
    FileUnwritable,
    FileUnsuitable,
    FileExists,
    FileNotPrivate,
    WrongFolder,
    DocumentUnreadable,
    DocumentEncrypted,
    DocumentTooLarge,
    DocumentChanged,
    DocumentUnknown,
    FontMissing,
    LimitExceeded,
    OutOfMemory,
    TooLarge,
    JsonMalformed,
    SettingsMalformed,
    SettingInvalid,
    SettingUnknown,
    SettingMissing,
    SettingsChanged,
    PatternInvalid,
    PresetMissing,
    ExpectationMalformed,
    NodeInvalid,
    NodeUnknown,
    NodeInUse,
    NodeDisabled,
    RefusedBySettings,
    PlanMalformed,
    PlanOutdated,
    MailingDamaged,
    MailingInvalid,
    MailingIdInvalid,
    MailingUnknown,
    MailingExists,
    LetterUnknown,
    LetterUnsuitable,
    StateRefused,
    SentBefore,
    QuotaExceeded,
    CarrierUnknown,
    CarrierUnavailable,
    CarrierUnsuitable,
    ReportUnreadable,
    ServiceNotFound,
    ServiceUnreachable,
    ConnectionLost,
    ConnectionBroken,
    ConnectionRefused,
    VersionMismatch,
    ServiceOutdated,
    CertificateUntrusted,
    TlsUnusable,
    TokenInvalid,
    TokenRefused,
    TokenUnknown,
    TokenNeeded,
    NameInvalid,
    NameTaken,
    NotAllowed,
    RequestInvalid,
    Superseded,
    ServiceRefused,
    ServiceSuspended,
    ServiceTrouble,
    AddressUnusable,
    DataFolderUnusable,
    DataFolderBusy,
    LeaseLost,
    DatabaseMissing,
    DatabaseUnusable,
    DatabaseUnavailable,
    DatabaseBusy,
    DatabaseDamaged,
    DatabaseNewer,
    DatabaseFailed,
    ProgramLimited,
    SystemFailed,
    Unexpected,
    COUNT_,
};

struct CodeRow {
    Code code;
    /// Stable.
    char const* name;
    /// What has happened, in a sentence.
    char const* summary;
};

/// One row a code, in the order of Code.
std::vector<CodeRow> codes();
char const* nameOf(Code code);
std::optional<Code> codeNamed(std::string_view name);

} // namespace Base
