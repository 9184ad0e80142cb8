#pragma once
// What clients are told of letters that went out before.

#include "programs/policy/rights.h"
#include "programs/protocol/letter_register.h"
#include "programs/vlserviced/store/letter_register.h"
#include "programs/vlserviced/store/letter_store.h"

namespace VlServiced {

/// Of mailings that the grant does not cover no more than that and when they went out.
Protocol::RegisterAnswer knownLetters(Protocol::RegisterQuery const& query,
                                      LetterRegister const& letterRegister, JobStore const& jobs,
                                      LetterStore const& letters, long long now, Policy::Grant const& by);

} // namespace VlServiced
