#pragma once
// E-mails that tell that a mailing, or one of its letters, was handed over: who gets them, and what they say.

#include "programs/carriers/carrier.h"
#include "programs/mailing/metadata.h"
#include "programs/vlserviced/store/letter_store.h"

#include <vector>

namespace VlServiced {

/// The sender, where the mailing's pack preset wants that confirmed and says who it is.
void addConfirmation(Mailing::Metadata const& mailing, std::vector<Notice>& notices);
/// The notification addresses of the mailing's letter of that number, each once.
void addNotifications(Mailing::Metadata const& mailing, long long number, Mailing::MailedLetter const& letter,
                      std::vector<Notice>& notices);

/// The e-mail, by what is on record: of the mailing to its sender, with how many letters are where; of one
/// letter to others, with nothing out of the letter but its reference.
Carriers::Notice written(StoredLetter const& notice, Job const& job, LetterStore const& letters);

} // namespace VlServiced
