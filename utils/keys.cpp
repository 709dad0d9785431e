#include <tuvosharing/keys.h>

const char* SZ_X_SHARING_HEADER = "HTTP_X_TUVO_SHARING";

namespace TUVO::sharing {

const std::int32_t SHARING_HASH_LENGTH = 9;
const std::int32_t SHARING_SESSION_LENGTH = 32;
const std::int32_t SHARING_MAX_RETRY_TIMES = 50;
const std::int32_t SHARING_PASS_HASH_LENGTH = 6;

const char* SZF_SHARING_DB_PATH = "/usr/tuvo/etc/private/session/sharing.db";

const char* SZK_UID_ = "uid";
const char* SZK_SESSION_ID_ = "session_id";
const char* SZK_TIMEOUT = "timeout";
const char* SZK_IP_ = "ip";
const char* SZK_ENTRY_ID = "entry_id";
const char* SZK_DATA = "data";
const char* SZK_PRIVATE_DATA = "private_data";
const char* SZK_APP = "app";
const char* SZK_PLUGINS = "plugins";
const char* SZK_REDIRECT_URI = "redirect_uri";
const char* SZK_REDIRECT_TYPE = "redirect_type";
const char* SZK_PROTECT_GROUPS = "protect_groups";
const char* SZK_PROTECT_EXTRA_GROUPS = "protect_extra_groups";
const char* SZK_PROTECT_GIDS = "protect_gids";
const char* SZK_PROTECT_USERS = "protect_users";
const char* SZK_PROTECT_EXTRA_USERS = "protect_extra_users";
const char* SZK_PROTECT_UIDS = "protect_uids";
const char* SZK_PROTECT_PASSWORD_SALT = "protect_password_salt";
const char* SZK_PROTECT_PASSWORD_ALGO_MD5 = "md5";
const char* SZK_PROTECT_PASSWORD_ALGO_DEFAULT = "default";
const char* SZK_PROTECT_PASSWORD_ALGO = "protect_password_algo";
const char* SZK_PROTECT_PASSWORD = "protect_password";
const char* SZK_PROTECT_TITLE = "protect_title";
const char* SZK_PROTECT_TYPE = "protect_type";
const char* SZK_ENABLE_MATCH_IP = "enable_match_ip";
const char* SZK_USE_COUNT = "use_count";
const char* SZK_EXPIRE_TIMES = "expire_times";
const char* SZK_EXPIRE_AT = "expire_at";
const char* SZK_START_AT = "start_at";
const char* SZK_OWNER_USER = "owner_user";
const char* SZK_OWNER_UID = "owner_uid";
const char* SZK_AUTO_GC = "auto_gc";
const char* SZK_ENABLED_ = "enabled";
const char* SZK_PROJECT_NAME = "project_name";
const char* SZK_ZOR_PASSWORD = "zor_password";
const char* SZK_ZOR_USERNAME = "zor_username";
const char* SZK_PASSWORD_ = "password";
const char* SZK_SHARING_SID = "sharing_sid";
const char* SZK_SHARING_ID = "sharing_id";
const char* SZK_HASH = "hash";
const char* SZK_ID_ = "id";
const char* SZK_REDIRECT_REDIRECT_ALWAYS = "always";
const char* SZK_REDIRECT_REDIRECT_URLPARAM = "url_param";
const char* SZK_REDIRECT_REDIRECT_NONE = "none";
const char* SZK_PROTECT_PROTECT_USER = "user";
const char* SZK_PROTECT_PROTECT_PASSWORD = "password";
const char* SZK_PROTECT_PROTECT_NONE = "none";
const char* SZK_JSCONFIG = "jsconfig";
const char* SZK_ASSISTANT = "assistant";
const char* SZK_EXTERNAL_IP_ = "external_ip";
const char* SZK_ACTION = "action";

}  // namespace TUVO::sharing
