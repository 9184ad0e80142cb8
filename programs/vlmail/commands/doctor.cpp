// vlmail doctor: whether all that sending takes is well, from this machine to the carriers, and what helps.
#include "programs/base/plain_text.h"
#include "programs/protocol/carrier.h"
#include "programs/protocol/health.h"
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/commands/service_options.h"
#include "programs/vlmail/service/service_client.h"
#include "programs/vlmail/terminal/text_table.h"
#include "vlservice/json/json_text.h"

#include <algorithm>
#include <cstdlib>
#include <ctime>
#include <exception>
#include <memory>
#include <optional>
#include <ostream>
#include <utility>
#include <vector>

namespace VlMail {
namespace {

using Protocol::HealthCheck;
using Protocol::HealthState;

/// In seconds, between this clock and the service's: an answer takes a moment, and minutes decide when
/// letters go.
constexpr long long MAX_DIFFERENCE = 5;
constexpr long long MAX_BEARABLE_DIFFERENCE = 60;

struct Options {
    ServiceOptions service;
    bool json = false;
};

/// Goes from what is near to what is far, and ends where nothing further can be had.
class Examination {
public:
    Examination(Options const& options, Terminal const& terminal) : options_(options), terminal_(terminal) {}

    std::vector<HealthCheck> checks() {
        if (find() && connect())
            askService();
        return std::move(checks_);
    }

private:
    bool find() {
        return attempt(
            "service",
            "start one, or name it with --service HOST:PORT; \"vlmail discover --doctor\" looks further",
            [&] {
                address_ = findService(options_.service);
                bool const isNamed = !options_.service.service.empty();
                add("service", (isNamed ? "is named: " : "answers a search, at ") + address_->text());
            });
    }

    bool connect() {
        return attempt("connection",
                       "see that the service runs there, and that the token is one of its own (--token FILE)",
                       [&] {
                           service_ = connectToService(*address_, options_.service, terminal_.err);
                           add("connection", "is let in");
                       });
    }

    void askService() {
        // It tells the keepers of the whole alone, and no older service does.
        attempt(
            "health", "use a token of the role admin for the root, and a service of this version",
            [&] {
                Protocol::HealthAnswer const answer(ask(*service_, Protocol::HealthQuery()));
                checks_.push_back(clockCheck(answer.now - std::time(nullptr)));
                checks_.insert(checks_.end(), answer.checks.begin(), answer.checks.end());
                for (auto const& carrier :
                     Protocol::CarriersAnswer(ask(*service_, Protocol::CarriersQuery())).carriers)
                    tryCarrier(carrier.channel);
            },
            HealthState::Doubtful);
    }

    static HealthCheck clockCheck(long long ahead) {
        long long const difference = std::abs(ahead);
        if (difference <= MAX_DIFFERENCE)
            return HealthCheck::well("clock", "the service's agrees with this one");
        return {"clock", difference <= MAX_BEARABLE_DIFFERENCE ? HealthState::Doubtful : HealthState::Bad,
                "the service's is " + std::to_string(difference) + " s " + (ahead > 0 ? "ahead" : "behind"),
                "set both by a time server"};
    }

    /// Without sending anything.
    void tryCarrier(std::string const& channel) {
        std::string const name = "carrier " + channel + ", tried";
        attempt(name, "\"vlmail settings service\" shows how it is set", [&] {
            Protocol::CarrierChange const test(Protocol::CarrierAction::Test, channel);
            add(name, Protocol::CarrierTestAnswer(ask(*service_, test)).says);
        });
    }

    void add(std::string name, std::string says) {
        checks_.push_back(HealthCheck::well(std::move(name), std::move(says)));
    }

    /// Whether it could be had.
    template<typename Work>
    bool attempt(std::string const& name, std::string const& remedy, Work const& work,
                 HealthState failed = HealthState::Bad) {
        try {
            work();
            return true;
        } catch (std::exception const& failure) {
            checks_.emplace_back(name, failed, Base::oneLine(failure.what()), remedy);
            return false;
        }
    }

    Options const& options_;
    Terminal const& terminal_;
    std::optional<ServiceAddress> address_;
    std::unique_ptr<Channel::Client> service_;
    std::vector<HealthCheck> checks_;
};

void print(std::ostream& out, std::vector<HealthCheck> const& checks) {
    TextTable table({{"check"}, {"state"}, {"what there is"}});
    for (HealthCheck const& check : checks)
        table.addRow({check.name, Protocol::healthStateName(check.state), check.says});
    table.print(out);
    for (HealthCheck const& check : checks)
        if (!check.remedy.empty())
            out << "remedy for " << check.name << ": " << Base::oneLine(check.remedy) << '\n';
}

json::Object inJson(std::vector<HealthCheck> const& checks) {
    json::Array all;
    for (HealthCheck const& check : checks)
        all.append(check.serialize());
    return {{"checks", all}};
}

int examine(Options const& options, Terminal const& terminal) {
    std::vector<HealthCheck> const checks = Examination(options, terminal).checks();
    if (options.json)
        terminal.out << inJson(checks) << '\n';
    else
        print(terminal.out, checks);
    auto const worst = std::ranges::max(checks, {}, &HealthCheck::state).state;
    return worst == HealthState::Well ? FINE : worst == HealthState::Doubtful ? INCOMPLETE : FAILED;
}

} // namespace

void addDoctorCommand(Base::Command const& app, Task& task) {
    auto const options = std::make_shared<Options>();
    Base::Command const command = app.addCommand(
        "doctor",
        "Examines all that sending takes: service, connection, clock, disks, certificate, carriers");
    command.addFlag("--json", options->json, "The result as one JSON object");
    addServiceOptions(command, options->service);
    command.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return examine(*options, terminal); }; });
}

} // namespace VlMail
