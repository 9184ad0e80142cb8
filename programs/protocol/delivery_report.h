#pragma once
// What a server of e-mail reports of a letter, as it is handed on to the service.

#include "programs/protocol/letter.h"

#include <string>

namespace Protocol {

/// Hands a report on: a message of the type multipart/report.
struct DeliveryReport {
    static constexpr char const* KIND = "delivery_report";
    static constexpr char const* IN_WORDS = "a delivery report";
    /// What it says stands in front of the message that came back.
    static constexpr std::size_t MAX_BYTES = std::size_t{1} << 20;

    std::string message;

    DeliveryReport() = default;
    /// Of the bytes of a message, which need not be UTF-8; what is behind MAX_BYTES is left out.
    explicit DeliveryReport(std::string_view bytes);
    /// Throws Error on a wrong type, and when it is too long.
    explicit DeliveryReport(json::Object const& object);
    json::Object serialize() const;

    struct Keys;
};

/// The letter that a report was about, as it is then.
struct DeliveryReportAnswer {
    /// Of the mailing.
    std::string id;
    LetterReport letter;

    DeliveryReportAnswer() = default;
    explicit DeliveryReportAnswer(json::Object const& object);
    json::Object serialize() const;
};

} // namespace Protocol
