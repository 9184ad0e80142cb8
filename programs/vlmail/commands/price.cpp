// vlmail price: what letters would cost, by the tariff of the service.
#include "programs/vlmail/mailings/price.h"

#include "programs/base/error.h"
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/commands/service_options.h"
#include "programs/vlmail/service/service_client.h"
#include "programs/vlmail/terminal/text_table.h"
#include "vlservice/json/json_text.h"
#include "vlservice/pack/pack_wrapper.h"

#include <algorithm>
#include <charconv>
#include <memory>
#include <optional>
#include <ostream>
#include <utility>

namespace VlMail {
namespace {

struct Options {
    ServiceOptions service;
    /// Each a number of letters and of pages, "20x3", or a mailing file.
    std::vector<std::string> what;
    bool colour = false;
    bool duplex = false;
    bool priority = false;
    std::string channel;
    bool json = false;
};

/// "20x3" is 20 letters of 3 pages, "3" one letter of 3 pages.
std::optional<Protocol::LetterBatch> batchIn(std::string const& text) {
    auto const number = [](std::string const& digits) {
        long long value = 0;
        auto const [end, error] = std::from_chars(digits.data(), digits.data() + digits.size(), value);
        return error == std::errc() && end == digits.data() + digits.size() && value > 0 ? value : 0;
    };
    auto const cross = text.find('x');
    Protocol::LetterBatch batch;
    batch.count = cross == std::string::npos ? 1 : number(text.substr(0, cross));
    batch.pages = number(cross == std::string::npos ? text : text.substr(cross + 1));
    return batch.count > 0 && batch.pages > 0 ? std::optional(batch) : std::nullopt;
}

Mailing::Metadata metadataOf(std::string const& file) {
    PackWrapper container(file, PackWrapper::PURPOSE_IMPORT, "");
    if (container.szBins() == 0)
        throw Base::Error(Base::Code::Usage,
                          "cannot estimate \"" + file +
                              "\": it is neither a mailing file nor a number of letters and pages like 20x3");
    return Mailing::Metadata::fromBlob(container.inputFullMeta());
}

std::vector<Protocol::LetterBatch> lettersIn(Options const& options) {
    std::vector<Protocol::LetterBatch> batches;
    for (std::string const& text : options.what) {
        if (std::optional<Protocol::LetterBatch> const batch = batchIn(text)) {
            batches.push_back(*batch);
        } else {
            std::vector<Protocol::LetterBatch> const ofMailing = pricedLettersOf(metadataOf(text));
            batches.insert(batches.end(), ofMailing.begin(), ofMailing.end());
        }
    }
    for (Protocol::LetterBatch& batch : batches) {
        batch.colour |= options.colour;
        if (options.duplex && !batch.duplex) {
            batch.duplex = true;
            batch.paperSheets = 0;
        }
        batch.priority |= options.priority;
        if (!options.channel.empty())
            batch.channel = options.channel;
    }
    return batches;
}

void print(std::ostream& out, std::vector<Protocol::LetterBatch> const& batches,
           Protocol::Estimate const& estimate) {
    constexpr auto RIGHT = TextTable::Align::Right;
    TextTable table({{"letters", RIGHT},
                     {"channel"},
                     {"pages each", RIGHT},
                     {"sheets each", RIGHT},
                     {estimate.currency, RIGHT}});
    for (std::size_t i = 0; i < std::min(batches.size(), estimate.letters.size()); ++i) {
        auto const& [sheets, price] = estimate.letters[i];
        table.addRow({std::to_string(batches[i].count), batches[i].channel, std::to_string(batches[i].pages),
                      std::to_string(sheets), money(price)});
    }
    table.print(out);
    out << "in all " << money(estimate.total) << ' ' << estimate.currency << '\n';
}

int showPrice(Options const& options, Terminal const& terminal) {
    std::vector<Protocol::LetterBatch> const batches = lettersIn(options);
    auto const service = connectToService(options.service, terminal.err);
    json::Object const prices = estimatePrice(*service, batches);
    if (options.json)
        terminal.out << prices << '\n';
    else
        print(terminal.out, batches, Protocol::Estimate(prices));
    return FINE;
}

} // namespace

void addPriceCommand(Base::Command const& app, Task& task) {
    auto const options = std::make_shared<Options>();
    Base::Command const price =
        app.addCommand("price", "Estimates what letters cost, by the service's tariff");
    price.addOption("WHAT", options->what, "Mailing files, or letters and pages of each: 20x3").required();
    price.addFlag("--colour", options->colour, "Printed in colour, also where the mailing does not say so");
    price.addFlag("--duplex", options->duplex,
                  "Printed on both sides, also where the mailing does not say so");
    price.addFlag("--priority", options->priority,
                  "Delivered with priority, also where the mailing does not say so");
    price.addOption("--channel", options->channel,
                    "The channel that they go by, also where the mailing says another");
    price.addFlag("--json", options->json, "The service's answer as one JSON object");
    addServiceOptions(price, options->service);
    price.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return showPrice(*options, terminal); }; });
}

} // namespace VlMail
