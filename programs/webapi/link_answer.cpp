#include "webapi/link_answer.h"

#include "owner/link_address.h"
#include "owner/link_json.h"
#include "owner/text_check.h"

namespace webapi {

void AnswerLink(const TUVO::sharing::record::Entry& link, Turn* turn) {
  const owner::LinkAddress address = owner::AddressOf(link, turn->place);
  turn->data["link"] = owner::LinkJson(link, turn->now);
  turn->data["url"] = owner::RepairedUtf8(address.url);
  turn->data["url_type"] = address.type;
}

}  // namespace webapi
