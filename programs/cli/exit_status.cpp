#include "cli/exit_status.h"

namespace cli {

ExitStatus StatusOf(owner::Error error) {
  switch (error) {
    case owner::Error::kInternal:
      return ExitStatus::kFailed;
    case owner::Error::kNoSuchLink:
      return ExitStatus::kNoSuchLink;
    case owner::Error::kHashTaken:
      return ExitStatus::kTaken;
    case owner::Error::kForbidden:
    case owner::Error::kFileNotAllowed:
    case owner::Error::kNoAccount:
      return ExitStatus::kNotAllowed;
    case owner::Error::kBusy:
      return ExitStatus::kBusy;
    default:
      return ExitStatus::kUsage;
  }
}

owner::Error UsualErrorOf(ExitStatus status) {
  switch (status) {
    case ExitStatus::kUsage:
      return owner::Error::kBadValue;
    case ExitStatus::kNoSuchLink:
      return owner::Error::kNoSuchLink;
    case ExitStatus::kTaken:
      return owner::Error::kHashTaken;
    case ExitStatus::kNotAllowed:
      return owner::Error::kForbidden;
    case ExitStatus::kBusy:
      return owner::Error::kBusy;
    default:
      return owner::Error::kInternal;
  }
}

}  // namespace cli
