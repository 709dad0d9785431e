#include <internal/entry_alike.h>
#include <internal/entry_private.h>

namespace TUVO::sharing::record {

bool ProtectAlike(const Entry& one, const Entry& other) {
  const EntryPrivate& a = *one.p_;
  const EntryPrivate& b = *other.p_;
  return one.get_id() == other.get_id() && a.protect_type_ == b.protect_type_ &&
         a.protect_password_ == b.protect_password_ && a.protect_uids_ == b.protect_uids_ &&
         a.protect_extra_users_ == b.protect_extra_users_ && a.protect_gids_ == b.protect_gids_ &&
         a.protect_extra_groups_ == b.protect_extra_groups_;
}

}  // namespace TUVO::sharing::record
