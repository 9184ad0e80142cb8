#include "programs/carriers/mime_message.h"

#include "programs/base/base64.h"
#include "programs/base/error.h"

#include <gmime/gmime.h>

#include <algorithm>
#include <array>
#include <cstring>
#include <memory>
#include <mutex>
#include <optional>
#include <utility>

namespace Carriers {
namespace {

template<typename T>
struct Unref {
    void operator()(T* object) const { g_object_unref(object); }
};
template<typename T>
using Held = std::unique_ptr<T, Unref<T>>;

template<typename T>
Held<T> held(T* object) {
    return Held<T>(object);
}

void beginOnce() {
    static std::once_flag once;
    std::call_once(once, [] { g_mime_init(); });
}

Held<GMimeStream> streamOf(std::string_view bytes) {
    return held(g_mime_stream_mem_new_with_buffer(bytes.empty() ? "" : bytes.data(), bytes.size()));
}

std::string bytesOf(GMimeStream* stream) {
    GByteArray const* const bytes = g_mime_stream_mem_get_byte_array(GMIME_STREAM_MEM(stream));
    return {reinterpret_cast<char const*>(bytes->data), bytes->len};
}

Held<GMimePart> partOf(char const* type, char const* subtype, std::string_view bytes,
                       GMimeContentEncoding encoding) {
    auto part = held(g_mime_part_new_with_type(type, subtype));
    auto const stream = streamOf(bytes);
    auto const content =
        held(g_mime_data_wrapper_new_with_stream(stream.get(), GMIME_CONTENT_ENCODING_DEFAULT));
    g_mime_part_set_content(part.get(), content.get());
    g_mime_part_set_content_encoding(part.get(), encoding);
    return part;
}

Held<GMimePart> textPart(std::string const& text) {
    auto part = partOf("text", "plain", text, GMIME_CONTENT_ENCODING_QUOTEDPRINTABLE);
    g_mime_object_set_content_type_parameter(GMIME_OBJECT(part.get()), "charset", "utf-8");
    return part;
}

/// Without its content, which is large: MimeText puts it in.
Held<GMimePart> filePart(MailAttachment const& attachment) {
    auto part = partOf("application", "pdf", {}, GMIME_CONTENT_ENCODING_BASE64);
    g_mime_object_set_disposition(GMIME_OBJECT(part.get()), GMIME_DISPOSITION_ATTACHMENT);
    g_mime_part_set_filename(part.get(), attachment.name.c_str());
    return part;
}

/// No line of the parts begins so: base64 has "=" at the end alone, and quoted-printable none that "_" stands
/// behind.
constexpr char const* BOUNDARY = "=_part";
constexpr std::string_view END_OF_PART = "\r\n--=_part";

/// Of twelve bits.
using Pair = std::array<char, 2>;
constexpr std::array<Pair, 4096> PAIRS = [] {
    constexpr std::string_view DIGITS = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
    std::array<Pair, 4096> pairs{};
    for (std::size_t i = 0; i < pairs.size(); ++i)
        pairs[i] = {DIGITS[i / 64], DIGITS[i % 64]};
    return pairs;
}();

/// Of all three bytes.
char* writeGroup(char* into, unsigned char const* bytes) {
    unsigned const bits = bytes[0] << 16U | bytes[1] << 8U | bytes[2];
    std::memcpy(into, PAIRS[bits >> 12U].data(), 2);
    std::memcpy(into + 2, PAIRS[bits & 0xFFFU].data(), 2);
    return into + 4;
}

/// In a line of base64, which has 76 characters and its end.
constexpr std::size_t BYTES_IN_A_LINE = 57;

char* writeLine(char* into, std::string_view bytes) {
    auto const* const from = reinterpret_cast<unsigned char const*>(bytes.data());
    for (std::size_t at = 0; at < BYTES_IN_A_LINE; at += 3)
        into = writeGroup(into, from + at);
    return std::copy_n("\r\n", 2, into);
}

std::size_t encodedSize(std::size_t bytes) {
    std::size_t const rest = bytes % BYTES_IN_A_LINE;
    return bytes / BYTES_IN_A_LINE * MimeText::MIN_ROOM + (rest == 0 ? 0 : (rest + 2) / 3 * 4 + 2);
}

/// Whole lines for which there is room, or else the last one; gives how many bytes of the file are in them.
std::size_t encode(char*& into, std::size_t room, std::string_view bytes) {
    std::size_t const lines = std::min(bytes.size() / BYTES_IN_A_LINE, room / MimeText::MIN_ROOM);
    for (std::size_t line = 0; line < lines; ++line)
        into = writeLine(into, bytes.substr(line * BYTES_IN_A_LINE));
    if (lines > 0 || room < MimeText::MIN_ROOM)
        return lines * BYTES_IN_A_LINE;
    std::string const last = Base::toBase64(bytes) + "\r\n";
    into = std::copy(last.begin(), last.end(), into);
    return bytes.size();
}

/// The text in front and the files behind it.
Held<GMimeMultipart> bodyOf(MailMessage const& message) {
    auto body = held(g_mime_multipart_new_with_subtype("mixed"));
    g_mime_multipart_set_boundary(body.get(), BOUNDARY);
    if (!message.text.empty())
        g_mime_multipart_add(body.get(), GMIME_OBJECT(textPart(message.text).get()));
    for (MailAttachment const& attachment : message.attachments)
        g_mime_multipart_add(body.get(), GMIME_OBJECT(filePart(attachment).get()));
    return body;
}

void setHeaders(GMimeMessage* mime, MailMessage const& message) {
    char const* const name = message.fromName.empty() ? nullptr : message.fromName.c_str();
    g_mime_message_add_mailbox(mime, GMIME_ADDRESS_TYPE_FROM, name, message.from.c_str());
    g_mime_message_add_mailbox(mime, GMIME_ADDRESS_TYPE_TO, nullptr, message.to.c_str());
    if (!message.replyTo.empty())
        g_mime_message_add_mailbox(mime, GMIME_ADDRESS_TYPE_REPLY_TO, nullptr, message.replyTo.c_str());
    g_mime_message_set_subject(mime, message.subject.c_str(), "utf-8");
    GDateTime* const now = g_date_time_new_now_utc();
    g_mime_message_set_date(mime, now);
    g_date_time_unref(now);
    g_mime_message_set_message_id(mime, message.messageId.c_str());
    // So that nobody's absence is answered.
    g_mime_object_set_header(GMIME_OBJECT(mime), "Auto-Submitted", "auto-generated", nullptr);
}

std::string lowerCase(std::string_view text) {
    std::string lower(text);
    std::ranges::transform(lower, lower.begin(), [](char c) {
        return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
    });
    return lower;
}

std::string_view trimmed(std::string_view text) {
    constexpr std::string_view BLANKS = " \t\r\n";
    std::size_t const begin = std::min(text.find_first_not_of(BLANKS), text.size());
    return text.substr(begin, text.find_last_not_of(BLANKS) + 1 - begin);
}

/// The first field of that name, in lower case, in lines of the form "Name: value", of which those that begin
/// with a blank go on with the one before.
std::string fieldIn(std::string_view lines, std::string_view name) {
    std::string value;
    bool isFound = false;
    for (std::size_t at = 0; at < lines.size();) {
        std::size_t const end = std::min(lines.find('\n', at), lines.size());
        std::string_view const line = lines.substr(at, end - at);
        at = end + 1;
        bool const goesOn = line.starts_with(' ') || line.starts_with('\t');
        if (isFound && !goesOn)
            break;
        std::size_t const colon = line.find(':');
        if (isFound)
            value += ' ' + std::string(trimmed(line));
        else if (!goesOn && colon != line.npos && lowerCase(trimmed(line.substr(0, colon))) == name) {
            value = trimmed(line.substr(colon + 1));
            isFound = true;
        }
    }
    return value;
}

/// "KEY@HOST" of "<KEY@HOST>", the last of them where there are more; empty when there is none.
std::string idIn(std::string_view text) {
    std::size_t const end = text.rfind('>');
    std::size_t const begin = end == text.npos ? end : text.rfind('<', end);
    return begin == text.npos ? std::string() : std::string(text.substr(begin + 1, end - begin - 1));
}

std::string contentOf(GMimePart* part) {
    GMimeDataWrapper* const content = g_mime_part_get_content(part);
    if (!content)
        return {};
    auto const out = held(g_mime_stream_mem_new());
    g_mime_data_wrapper_write_to_stream(content, out.get());
    return bytesOf(out.get());
}

std::string headersOf(GMimeObject* object) {
    char* const headers = g_mime_object_get_headers(object, nullptr);
    std::string text = headers ? headers : "";
    g_free(headers);
    return text;
}

bool isOfType(GMimeObject* object, char const* type, char const* subtype) {
    GMimeContentType* const content = g_mime_object_get_content_type(object);
    return content && g_mime_content_type_is_type(content, type, subtype);
}

/// What is gathered from the parts of a report.
struct Parts {
    /// Fields of the whole and of each recipient.
    std::optional<std::string> status;
    std::string messageId;

    void take(GMimeObject* part) {
        if (isOfType(part, "message", "delivery-status") && GMIME_IS_PART(part))
            status = contentOf(GMIME_PART(part));
        else if (isOfType(part, "text", "rfc822-headers") && GMIME_IS_PART(part))
            messageId = idIn(fieldIn(contentOf(GMIME_PART(part)), "message-id"));
        else if (GMIME_IS_MESSAGE_PART(part)) {
            GMimeMessage* const original = g_mime_message_part_get_message(GMIME_MESSAGE_PART(part));
            if (original)
                messageId = idIn(fieldIn(headersOf(GMIME_OBJECT(original)), "message-id"));
        }
    }
};

Parts partsOf(GMimeObject* body) {
    Parts parts;
    if (!GMIME_IS_MULTIPART(body))
        return parts;
    GMimeMultipart* const multipart = GMIME_MULTIPART(body);
    for (int i = 0; i < g_mime_multipart_get_count(multipart); ++i)
        parts.take(g_mime_multipart_get_part(multipart, i));
    return parts;
}

MailReport::Kind kindOf(std::string const& action) {
    if (action == "failed")
        return MailReport::Kind::Returned;
    return action == "delivered" ? MailReport::Kind::Delivered : MailReport::Kind::UnderWay;
}

/// "smtp; 550 no such user" without what kind of words they are.
std::string wordsOf(std::string const& status) {
    std::string const words = fieldIn(status, "diagnostic-code");
    std::size_t const kind = words.find(';');
    return std::string(trimmed(kind == words.npos ? words : std::string_view(words).substr(kind + 1)));
}

/// All but the contents of files.
std::string frameOf(MailMessage const& message) {
    beginOnce();
    auto const mime = held(g_mime_message_new(TRUE));
    setHeaders(mime.get(), message);
    g_mime_message_set_mime_part(mime.get(), GMIME_OBJECT(bodyOf(message).get()));
    GMimeFormatOptions* const options = g_mime_format_options_new();
    g_mime_format_options_set_newline_format(options, GMIME_NEWLINE_FORMAT_DOS);
    auto const out = held(g_mime_stream_mem_new());
    g_mime_object_write_to_stream(GMIME_OBJECT(mime.get()), options, out.get());
    g_mime_format_options_free(options);
    return bytesOf(out.get());
}

} // namespace

MimeText::MimeText(MailMessage const& message) : frame_(frameOf(message)) {
    // Each file stands in front of the end of its part, which are the last ones.
    std::string_view rest = frame_;
    std::vector<std::string_view> behind;
    for (std::size_t i = message.attachments.size(); i-- > 0;) {
        std::size_t const end = rest.rfind(END_OF_PART);
        behind.push_back(rest.substr(end));
        rest = rest.substr(0, end);
    }
    pieces_.push_back({rest});
    for (MailAttachment const& file : message.attachments) {
        pieces_.push_back({file.bytes, true});
        pieces_.push_back({behind.back()});
        behind.pop_back();
    }
    for (Piece const& piece : pieces_)
        size_ += piece.isFile ? encodedSize(piece.bytes.size()) : piece.bytes.size();
}

std::size_t MimeText::read(char* into, std::size_t room) {
    char* end = into;
    for (; piece_ < pieces_.size(); ++piece_, at_ = 0) {
        auto const& [bytes, isFile] = pieces_[piece_];
        while (at_ < bytes.size()) {
            std::size_t const left = room - static_cast<std::size_t>(end - into);
            std::size_t const taken =
                isFile ? encode(end, left, bytes.substr(at_)) : bytes.copy(end, left, at_);
            if (taken == 0)
                return static_cast<std::size_t>(end - into);
            end += isFile ? 0 : taken;
            at_ += taken;
        }
    }
    return static_cast<std::size_t>(end - into);
}

std::string inMime(MailMessage const& message) {
    MimeText mime(message);
    std::string text(mime.size() + MimeText::MIN_ROOM, '\0');
    text.resize(mime.read(text.data(), text.size()));
    return text;
}

MailReport mailReportIn(std::string_view message) {
    beginOnce();
    auto const stream = streamOf(message);
    auto const parser = held(g_mime_parser_new_with_stream(stream.get()));
    auto const mime = Held<GMimeMessage>(g_mime_parser_construct_message(parser.get(), nullptr));
    GMimeObject* const body = mime ? g_mime_message_get_mime_part(mime.get()) : nullptr;
    if (!body || !isOfType(body, "multipart", "report"))
        throw Base::Error(Base::Code::ReportUnreadable,
                          "the message is no report of a server of e-mail (multipart/report)");
    Parts const parts = partsOf(body);
    if (!parts.status)
        throw Base::Error(Base::Code::ReportUnreadable,
                          "the report does not tell what became of a message (message/delivery-status)");
    MailReport report{kindOf(lowerCase(fieldIn(*parts.status, "action"))), parts.messageId,
                      wordsOf(*parts.status)};
    if (report.messageId.empty())
        report.messageId = idIn(fieldIn(headersOf(GMIME_OBJECT(mime.get())), "in-reply-to"));
    if (report.messageId.empty())
        throw Base::Error(Base::Code::ReportUnreadable,
                          "the report does not tell which message it is about (Message-ID)");
    return report;
}

} // namespace Carriers
