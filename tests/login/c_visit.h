/* A visitor's whole visit, as a program in C makes it. */
#ifndef TESTS_LOGIN_C_VISIT_H_
#define TESTS_LOGIN_C_VISIT_H_

#ifdef __cplusplus
extern "C" {
#endif

/* What the operations returned, in the order in which they were called. */
struct c_visit {
  char session_id[33];
  int login;
  int check;
  int count;
  int logout;
  int check_after_logout;
};

/* The login's parameters as C lays them out: where each begins, and the size of all. */
struct c_params_layout {
  unsigned int sharing_id;
  unsigned int password;
  unsigned int zor_username;
  unsigned int zor_password;
  unsigned int sharing_sid;
  unsigned int size;
};

struct c_params_layout get_c_params_layout(void);

/* Visits the link `hash` that has the password `password`. */
struct c_visit make_c_visit(const char* hash, const char* password);

#ifdef __cplusplus
}
#endif

#endif /* TESTS_LOGIN_C_VISIT_H_ */
