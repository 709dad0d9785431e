#include "visitor/refusal.h"

namespace visitor {

namespace {

// The library's result codes; the same number can mean different things at login and at a visit.
constexpr int kExpired = -1;
constexpr int kAccountRefused = -2;
constexpr int kLoginLinkNotValid = -3;
constexpr int kNoSession = -5;
constexpr int kVisitLinkNotValid = -6;
constexpr int kNotAdmitted = -7;
constexpr int kAddress = -8;
constexpr int kWrongPassword = -9;
constexpr int kAccountNotListed = -10;
constexpr int kUsedUp = -11;

Refusal Ask(std::string_view complaint) {
  return {complaint, Notice::kFailure};
}

Refusal Tell(Notice notice) {
  return {{}, notice};
}

}  // namespace

Refusal RefusedLogin(int code) {
  switch (code) {
    case kAccountRefused:
      // One text for every reason, so that nobody learns which accounts there are.
      return Ask("The account name or the password is wrong. Check both and try again.");
    case kLoginLinkNotValid:
      // Of a link that is open this is a form sent without what the link asks for.
      return Ask("What you typed could not be checked. Fill in every field and try again.");
    case kAddress:
      return Tell(Notice::kBlocked);
    case kWrongPassword:
      return Ask("The password is wrong. Check it, with its capital letters, and try again.");
    case kAccountNotListed:
      return Ask(
          "This link is not for that account. Use another account, or ask the person who sent you "
          "the link to add yours.");
    case kUsedUp:
      return Tell(Notice::kUsedUp);
    default:
      return Tell(Notice::kFailure);
  }
}

Refusal RefusedVisit(int code) {
  switch (code) {
    case kExpired:
      return Ask("Your access has expired. Open the link again.");
    case kAccountRefused:
      return Ask(
          "Your account may no longer open this link. Sign in with another one, or ask the "
          "person who sent you the link.");
    case kNoSession:
    case kNotAdmitted:
      return Ask("You are not, or no longer, admitted to this link. Open it below.");
    case kVisitLinkNotValid:
      return Tell(Notice::kNotFound);
    case kAddress:
      return Ask("Your network address has changed since you opened this link. Open it again.");
    default:
      return Tell(Notice::kFailure);
  }
}

}  // namespace visitor
