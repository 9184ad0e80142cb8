#pragma once
// Letters printed by a printer, or by a print server.

#include "programs/carriers/carrier.h"
#include "programs/carriers/printer_session.h"

namespace Carriers {

/// A job for each parcel, whose name is the key. A job gets its document behind its making, so that it can be
/// taken back and asked about by its number.
class PrinterCarrier : public Carrier {
public:
    explicit PrinterCarrier(std::string const& uri, StopSign const& stop = {});

    Outcome handOver(Parcel const& parcel, PutOnRecord const& mayHaveIt) override;
    std::map<std::string, Progress> ask(std::set<std::string> const& keys) override;
    std::string test() override;

private:
    void cancelLeft(std::string const& key);
    Outcome given(int job, Parcel const& parcel, std::string const& more);
    bool isTakenBack(int job);
    Progress toldOf(PrinterJob const& job, std::string const& hindrance);

    std::string uri_;
    PrinterSession session_;
};

/// What keeps a printer from printing, on one line: "out of paper"; empty where nothing does.
std::string reasonsInWords(std::vector<std::string> const& reasons);

} // namespace Carriers
