#pragma once
// E-mails as bytes: those that are sent, and what the reports on them say.

#include <string>
#include <string_view>
#include <vector>

namespace Carriers {

struct MailAttachment {
    /// Of the file, as the recipient sees it.
    std::string name;
    /// A PDF, which has to outlive what is made of it.
    std::string_view bytes;
};

/// Each text is valid UTF-8 without control characters, `text` with line feeds.
struct MailMessage {
    /// One plain address each.
    std::string from;
    /// A person's or company's; may be empty.
    std::string fromName;
    std::string to;
    /// May be empty.
    std::string replyTo;
    std::string subject;
    /// May be empty.
    std::string text;
    /// "KEY@HOST"
    std::string messageId;
    std::vector<MailAttachment> attachments;
};

/// A message as it is sent, with lines that end in carriage return and line feed. The same but for the date
/// when it is made again. Files are encoded while it is read.
class MimeText {
public:
    /// A line of an encoded file.
    static constexpr std::size_t MIN_ROOM = 78;

    explicit MimeText(MailMessage const& message);

    std::size_t size() const { return size_; }
    /// The next bytes, of which there is room for MIN_ROOM at least; 0 at the end.
    std::size_t read(char* into, std::size_t room);

private:
    /// A text as it stands, or a file.
    struct Piece {
        std::string_view bytes;
        bool isFile = false;
    };

    std::string frame_;
    std::vector<Piece> pieces_;
    std::size_t size_ = 0;
    /// That is read.
    std::size_t piece_ = 0;
    /// Of its bytes.
    std::size_t at_ = 0;
};

/// All of it.
std::string inMime(MailMessage const& message);

/// What a server of e-mail reports of a message that was sent.
struct MailReport {
    enum class Kind {
        /// It has reached the recipient's mailbox.
        Delivered,
        /// It came back.
        Returned,
        /// It is still on its way.
        UnderWay,
    };

    Kind kind = Kind::UnderWay;
    /// "KEY@HOST" of the message that was sent.
    std::string messageId;
    /// In the server's words.
    std::string says;
};

/// Of a message of the type multipart/report, also where its end is missing. Throws Error when it is none, or
/// does not tell which message it is about.
MailReport mailReportIn(std::string_view message);

} // namespace Carriers
