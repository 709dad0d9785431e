#include <gcrypt.h>
#include <internal/late_library.h>
// MD5 through these calls is what stored passwords were made with; newer OpenSSL marks them old.
#define OPENSSL_SUPPRESS_DEPRECATED
#include <openssl/md5.h>
#include <tuvosharing/utils.h>

#include <memory>
#include <new>

namespace TUVO::sharing {

namespace {

using internal::LateFunctions;
using internal::LateLibrary;

class Libcrypto {
  const LateLibrary library_{TUVO_LIBCRYPTO_SONAME};

 public:
  decltype(MD5_Init)* const md5_init = library_.Find<decltype(MD5_Init)>("MD5_Init");
  decltype(MD5_Update)* const md5_update = library_.Find<decltype(MD5_Update)>("MD5_Update");
  decltype(MD5_Final)* const md5_final = library_.Find<decltype(MD5_Final)>("MD5_Final");
};

class Libgcrypt {
  const LateLibrary library_{TUVO_LIBGCRYPT_SONAME};

 public:
  decltype(gcry_control)* const control = library_.Find<decltype(gcry_control)>("gcry_control");
  decltype(gcry_md_get_algo_dlen)* const md_get_algo_dlen =
      library_.Find<decltype(gcry_md_get_algo_dlen)>("gcry_md_get_algo_dlen");
  decltype(gcry_md_hash_buffer)* const md_hash_buffer =
      library_.Find<decltype(gcry_md_hash_buffer)>("gcry_md_hash_buffer");
};

// Writes two digits a byte and a zero into `text`, which has room for them.
void WriteHex(const unsigned char* digest, size_t length, char* text) {
  constexpr char kDigits[] = "0123456789abcdef";
  for (size_t i = 0; i < length; ++i) {
    *text++ = kDigits[digest[i] >> 4U];
    *text++ = kDigits[digest[i] & 15U];
  }
  *text = '\0';
}

}  // namespace

bool MD5HashPassword(const std::string& password, std::string& out) {
  if (password.empty()) {
    return false;
  }
  const auto* crypto = LateFunctions<Libcrypto>();
  unsigned char digest[MD5_DIGEST_LENGTH];
  MD5_CTX context;
  if (crypto == nullptr || crypto->md5_init(&context) < 1 ||
      crypto->md5_update(&context, password.data(), password.size()) < 1 ||
      crypto->md5_final(digest, &context) < 1) {
    return false;
  }
  char text[2 * MD5_DIGEST_LENGTH + 1];
  WriteHex(digest, sizeof digest, text);
  out = text;
  return true;
}

bool Sha1WithSaltHashPassword(const std::string& password, const std::string& salt,
                              std::string& out) {
  const std::string salted = password + salt;
  const auto* gcrypt = LateFunctions<Libgcrypt>();
  if (gcrypt == nullptr) {
    return false;
  }
  // Nobody else in the process is counted on to have made libgcrypt ready; repeating it is
  // harmless.
  gcrypt->control(GCRYCTL_DISABLE_SECMEM, 0);
  gcrypt->control(GCRYCTL_INITIALIZATION_FINISHED, 0);
  const unsigned int length = gcrypt->md_get_algo_dlen(GCRY_MD_SHA1);
  unsigned char digest[20];
  if (length != sizeof digest) {
    return false;
  }
  gcrypt->md_hash_buffer(GCRY_MD_SHA1, digest, salted.data(), salted.size());
  const std::unique_ptr<char[]> text(new (std::nothrow) char[2 * length + 1]);
  if (!text) {
    return false;
  }
  WriteHex(digest, length, text.get());
  out = text.get();
  return true;
}

}  // namespace TUVO::sharing
