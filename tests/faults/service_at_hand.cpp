#include "tests/faults/service_at_hand.h"

#include <fstream>
#include <regex>

namespace Faults {

ServiceAtHand::ServiceAtHand() {
    std::filesystem::create_directory(folder_);
    std::filesystem::create_directories(packDatabase().parent_path());
    std::ofstream(folder_ / "letter.txt") << "Dear Mr Smith,\nhello.\n";
}

Ended ServiceAtHand::vlmail(std::vector<std::string> arguments, Fault const& fault) const {
    for (std::string const& more : {std::string("--service"), "127.0.0.1:" + std::to_string(service_.port()),
                                    std::string("--token"), (data_ / "token").string()})
        arguments.push_back(more);
    return runWith(fault, VLMAIL_PROGRAM, arguments, {folder_, {{"XDG_DATA_HOME", home_.string()}}});
}

std::string ServiceAtHand::verify(std::filesystem::path const& mailing) const {
    return runWith({}, VLMAIL_PROGRAM, {"pack", "verify", mailing.string()}, {folder_}).out;
}

std::string withoutIds(std::string const& text) {
    static std::regex const id("[0-9]{8}T[0-9]{6}Z-[0-9a-f]{8}");
    return std::regex_replace(text, id, "ID");
}

bool saysWhy(std::string const& errors) {
    return errors.starts_with("vlmail: ") || errors.find("\nvlmail: ") != std::string::npos;
}

std::vector<std::string> faultsInEnd(Fault const& fault, Ended const& ended) {
    if (ended.isLate)
        return {"does not end within two minutes"};
    if (ended.status < 0 && !fault.kills())
        return {"dies of signal " + std::to_string(-ended.status)};
    if (ended.status > 2)
        return {"ends with status " + std::to_string(ended.status)};
    return {};
}

} // namespace Faults
