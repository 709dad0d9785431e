// Uses the library from C++ beyond what the README's example does: makes a link in another's name,
// finds it again, lets a visitor in and out, and removes it.
#include <tuvosharing/tuvosharing.h>

#include <iostream>
#include <string>
#include <vector>

using namespace TUVO::sharing;

namespace {

int failures = 0;

void Expect(bool condition, const char* what) {
  if (!condition) {
    std::cerr << "failed: " << what << '\n';
    ++failures;
  }
}

}  // namespace

int main() {
  db::BaseDB& database = db::SharingDB::Instance();
  db::EntryDB links(database);
  record::Entry link;
  link.set_project_name("album").set_owner_uid(4242).set_app(Json::objectValue);
  link.set_protect_type(record::Entry::PROTECT_PASSWORD);
  link.set_protect_password("honey", true, record::Entry::ENCRYPT_ALGO_DEFAULT);
  Expect(links.CreateWithHash(link), "making a link");

  record::Entry found;
  Expect(links.GetByHash(link.get_hash(), found), "finding it by its hash");
  Expect(found.get_owner_uid() == 4242 && found.get_project_name() == "album", "what it holds");
  links.GetCondition().Where("owner_uid", "4242");
  std::vector<record::Entry> all;
  Expect(links.Query(all) && all.size() == 1, "finding it by its owner");

  const std::string hash = link.get_hash();
  std::string session;
  _tag_sharing_login_params visitor{hash.c_str(), "jam", nullptr, nullptr, nullptr};
  Expect(TUVO::TuvoSharingLogin(session, &visitor, false) == -9, "a wrong password");
  visitor.password = "honey";
  Expect(TUVO::TuvoSharingLogin(session, &visitor, false) == 1, "the password");
  visitor.sharing_sid = session.c_str();
  Expect(TUVO::TuvoSharingIsAuthorized(&visitor) == 1, "the next request");
  Expect(TUVO::TuvoSharingLogout(hash, session), "logging out");
  Expect(TUVO::TuvoSharingIsAuthorized(&visitor) != 1, "the request after that");
  Expect(links.DeleteByOwnerUid(4242) && !links.GetByHash(hash, found), "removing the link");
  return failures;
}
