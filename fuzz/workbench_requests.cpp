// Bytes to the workbench: each request that they make has an answer of HTTP, those without the token change
// and tell nothing, and a text that is changed at its places is the text that the answer holds. What runs
// patterns of the settings is left to the targets for patterns, which know what they cost.

#include "fuzz/private_folder.h"
#include "programs/base/error.h"
#include "programs/vlmail/workbench/admission.h"
#include "programs/vlmail/workbench/desk.h"
#include "programs/vlmail/workbench/document_list.h"
#include "programs/vlmail/workbench/page_files.h"
#include "programs/vlmail/workbench/printed_picture.h"
#include "programs/vlmail/workbench/request.h"
#include "vlservice/json/json_text.h"

#include <cstdint>
#include <cstdlib>
#include <fstream>
#include <string_view>
#include <variant>

namespace {

using namespace VlMail::Workbench;

Admission const ADMISSION{"t", 80};

Desk& desk() {
    static Desk one = [] {
        std::ofstream(privateFolder() / "letter.txt") << "\n\nDear Ms Roe\n";
        return Desk({privateFolder()});
    }();
    return one;
}

bool runsNoPatterns(std::string_view name) {
    for (std::string_view const one : {"edit", "adopt", "picture", "blocks", "none"})
        if (name == one)
            return true;
    return false;
}

/// The settings of the answer have to be JSON again.
void checkEdited(Answer const& answer) {
    if (answer.status != 200)
        return;
    json::Object const object = json::strToObject(answer.body.data(), answer.body.size());
    if (whatIsBroken(object.get("settings").toString()))
        std::abort();
}

/// Printed pages are read by the settings first. Which side is asked for is told in a form of its own.
bool asksForPrinted(std::string const& body) {
    try {
        json::Object const query = json::strToObject(body.data(), body.size());
        if (auto const side = sideIn(query.get("side"))) {
            auto const again = sideIn(json::Value(toJson(*side)));
            if (!again || again->kind != side->kind || again->page != side->page ||
                again->attachment != side->attachment)
                std::abort();
        }
        return query.get("settings").isString();
    } catch (json::Exc const&) {
        return false;
    } catch (Base::Error const&) {
        return false;
    }
}

Answer answerTo(Request const& request) {
    if (auto refusal = ADMISSION.refusalOf(request))
        return *refusal;
    if (!request.target.starts_with(API)) {
        Answer const file = pageFile(request.target, privateFolder());
        if (file.status != 200 && file.status != 404)
            std::abort();
        return file;
    }
    if (request.token != ADMISSION.token)
        std::abort();
    std::string const name = request.target.substr(std::string_view(API).size());
    if (!runsNoPatterns(name) || asksForPrinted(request.body))
        return {200, "text/plain", ""};
    Answer answer = desk().answer(name, request.body);
    if (name == "edit" || name == "adopt")
        checkEdited(answer);
    return answer;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    std::string_view const bytes(reinterpret_cast<char const*>(data), size);
    isNameInside(privateFolder(), std::string(bytes));
    RequestReader reader;
    reader.put(bytes);
    while (auto taken = reader.take()) {
        bool const isRequest = std::holds_alternative<Request>(*taken);
        Answer const answer = isRequest ? answerTo(std::get<Request>(*taken)) : std::get<Answer>(*taken);
        if (!wireTextOf(answer, isRequest).starts_with("HTTP/1.1 "))
            std::abort();
        if (!isRequest)
            break;
    }
    return 0;
}
