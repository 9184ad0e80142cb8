#include "programs/carriers/control_file.h"

#include "programs/base/plain_text.h"
#include "programs/base/utf8.h"
#include "vlservice/json/json_text.h"

#include <initializer_list>
#include <sstream>
#include <string_view>

namespace Carriers {
namespace {

json::Object inJson(OutgoingLetter const& letter) {
    return {{"order", letter.number},
            {"key", letter.key},
            {"first_page", letter.firstPage},
            {"pages", letter.pages},
            {"sheets", letter.sheets},
            {"coloured_pages", letter.colouredPages},
            {"address", Base::validUtf8(letter.address)}};
}

std::string line(std::initializer_list<std::string> fields) {
    std::string text;
    for (std::string const& field : fields)
        text += (text.empty() ? "" : ";") + csvField(field);
    return text + "\r\n";
}

/// Lines become parts with commas between.
std::string onOneLine(std::string const& text) {
    std::string joined;
    for (char const c : Base::validUtf8(text))
        joined += c == '\n' ? std::string(", ") : std::string(1, c);
    return Base::plainLine(joined);
}

} // namespace

void forEachFile(
    Parcel const& parcel,
    std::function<void(std::string const& name, std::string_view bytes, bool isLast)> const& write) {
    std::string const document = parcel.key + ".pdf";
    write(document, parcel.document, false);
    write(parcel.key + ".csv", controlCsv(parcel, document), false);
    write(parcel.key + ".json", controlJson(parcel, document), true);
}

std::string csvField(std::string const& text) {
    std::string field = onOneLine(text);
    if (!field.empty() && std::string_view("=+-@").find(field.front()) != std::string_view::npos)
        field.insert(0, 1, '\'');
    if (field.find_first_of(";\"") == std::string::npos)
        return field;
    std::string quoted = "\"";
    for (char const c : field)
        quoted += c == '"' ? std::string("\"\"") : std::string(1, c);
    return quoted + '"';
}

std::string controlJson(Parcel const& parcel, std::string const& file) {
    json::Array letters;
    for (OutgoingLetter const& letter : parcel.letters)
        letters.append(inJson(letter));
    std::ostringstream text;
    text << json::Object{{"key", parcel.key},     {"mailing", parcel.mailing}, {"file", file},
                         {"pages", parcel.pages}, {"duplex", parcel.isDuplex}, {"letters", letters}}
         << '\n';
    return std::move(text).str();
}

std::string controlCsv(Parcel const& parcel, std::string const& file) {
    std::string text = line(
        {"order", "key", "file", "first_page", "pages", "sheets", "duplex", "coloured_pages", "address"});
    for (OutgoingLetter const& letter : parcel.letters)
        text += line({std::to_string(letter.number), letter.key, file, std::to_string(letter.firstPage),
                      std::to_string(letter.pages), std::to_string(letter.sheets),
                      parcel.isDuplex ? "1" : "0", std::to_string(letter.colouredPages), letter.address});
    return text;
}

} // namespace Carriers
