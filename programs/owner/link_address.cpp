#include "owner/link_address.h"

#include <tuvosharing/sharing_url.h>

namespace owner {

LinkAddress AddressOf(const TUVO::sharing::record::Entry& link, const ServerPlace& place) {
  LinkAddress address;
  TUVO::sharing::_tag_SHARING_URL_TYPE type{};
  if (TUVO::sharing::GetSharingURL(link.get_project_name(), place.port, place.https,
                                   link.get_hash(), address.url, type)) {
    address.type = static_cast<int>(type);
  } else {
    address.url.clear();
  }
  return address;
}

}  // namespace owner
