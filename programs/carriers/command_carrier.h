#pragma once
// Letters given to a program, one at a time: gateways for fax and SMS, and whatever else there is.

#include "programs/carriers/carrier.h"

namespace Carriers {

/// Exit status 0 is accepted, 75 is to be tried later, others are refused. What is ended beyond a limit, or
/// by a signal, may have sent the letter.
class CommandCarrier : public Carrier {
public:
    explicit CommandCarrier(Protocol::CarrierSettings settings);

    Outcome handOver(Parcel const& parcel, PutOnRecord const& mayHaveIt) override;
    std::string test() override;

private:
    std::vector<std::string> argumentsFor(Parcel const& parcel) const;
    /// What the program reads on standard input.
    std::string inputFor(Parcel const& parcel) const;

    Protocol::CarrierSettings settings_;
};

} // namespace Carriers
