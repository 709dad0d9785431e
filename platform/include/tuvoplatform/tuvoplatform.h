// All of the platform's interfaces.
#ifndef TUVOPLATFORM_TUVOPLATFORM_H_
#define TUVOPLATFORM_TUVOPLATFORM_H_

#include <tuvoplatform/account.h>
#include <tuvoplatform/auto_block.h>
#include <tuvoplatform/cgi.h>
#include <tuvoplatform/database.h>
#include <tuvoplatform/file.h>
#include <tuvoplatform/process.h>
#ifdef __cplusplus
#include <tuvoplatform/random.h>
#endif

#endif  // TUVOPLATFORM_TUVOPLATFORM_H_
