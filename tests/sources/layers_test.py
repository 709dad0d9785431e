#!/usr/bin/env python3
"""Checks that every source file includes only what lies beside or below its own layer.

    layers_test.py PROJECT_FOLDER

A header that is in no layer yet is a failure too: decide where it belongs and add it below.
"""

import fnmatch
import pathlib
import re
import sys

# Layer: its files (patterns from the project's folder), then the layers that it may include besides
# itself. Records and connection know nothing of each other; the generic store brings them together.
LAYERS = {
    "platform": ("platform/*", []),
    "common": (
        "utils/* include/tuvosharing/{export,keys,utils,user_group,sharing_url,send_webapi}.h "
        "include/internal/{constant_time,contained,late_library,log,json_text,time_text,user_id,popen}.h",
        ["platform"],
    ),
    "rows": ("db/{field,row,row_values,result}.cpp include/tuvosharing/{field,row,result}.h "
             "include/internal/row_values.h",
             ["platform", "common"]),
    "connection": (
        "db/{base_db,condition,run_as}.cpp include/tuvosharing/{base_db,condition}.h "
        "include/internal/{base_db_private,condition_private,escaped,run_as}.h",
        ["platform", "common", "rows"],
    ),
    "record": (
        "record/* include/tuvosharing/{object,entry,session,token}.h "
        "include/internal/{entry,session,token}_private.h include/internal/entry_alike.h",
        ["platform", "common", "rows"],
    ),
    "generic store": (
        "db/{object_db,lookup,purge}.cpp include/tuvosharing/object_db.h "
        "include/internal/{object_db_query,lookup,purge}.h",
        ["common", "rows", "connection", "record"],
    ),
    "database": (
        "db/{sharing_db,write_transaction}.cpp include/tuvosharing/sharing_db.h "
        "include/internal/{sharing_db_private,write_transaction}.h",
        ["common", "rows", "connection"],
    ),
    "stores": (
        "db/{entry,session,token}_db.cpp include/tuvosharing/{entry,session,token}_db.h "
        "include/internal/{entry,session,token}_db_private.h",
        ["platform", "common", "rows", "connection", "record", "generic store"],
    ),
    "login": (
        "login/* include/tuvosharing/login.h include/internal/user_access.h",
        ["platform", "common", "rows", "connection", "record", "generic store", "database",
         "stores"],
    ),
    "everything": (
        "include/tuvosharing/tuvosharing.h",
        ["common", "rows", "connection", "record", "generic store", "database", "stores", "login"],
    ),
}

# The programs know the library's public headers and what they share, never each other.
LIBRARY = ["platform", "common", "rows", "connection", "record", "generic store", "database",
           "stores", "login", "everything"]
LAYERS["programs/common"] = ("programs/common/*", LIBRARY)
LAYERS["programs/owner"] = ("programs/owner/*", LIBRARY + ["programs/common"])
for program in ("visitor", "sharingurl", "demo"):
    LAYERS["programs/" + program] = (f"programs/{program}/*", LIBRARY + ["programs/common"])
for program in ("webapi", "cli"):
    LAYERS["programs/" + program] = (f"programs/{program}/*",
                                     LIBRARY + ["programs/common", "programs/owner"])

# Who may call SQLite itself; all others go through the platform's database interface.
SQLITE_USERS = ["platform/src/*", "db/base_db.cpp"]

FOLDERS = ["utils", "db", "record", "login", "include", "platform", "programs"]
INCLUDE = re.compile(r'^\s*#\s*include\s*([<"])([^">]+)[">]', re.MULTILINE)


def alternatives(pattern):
    """Expands the braces of one pattern."""
    braces = re.search(r"\{([^}]*)\}", pattern)
    if not braces:
        return [pattern]
    head, tail = pattern[: braces.start()], pattern[braces.end():]
    return [head + choice + tail for choice in braces.group(1).split(",")]


def layer_of(path):
    """The layer that a path from the project's folder lies in, None for none."""
    for layer, (patterns, _) in LAYERS.items():
        for pattern in patterns.split():
            if any(fnmatch.fnmatchcase(path, one) for one in alternatives(pattern)):
                return layer
    return None


def path_of(quote, name):
    """Where an included file lies in the project; None for a file from outside."""
    if name.startswith(("tuvosharing/", "internal/")):
        return "include/" + name
    if name.startswith("tuvoplatform/"):
        return "platform/include/" + name
    if quote == '"' and "programs/" + name.split("/")[0] in LAYERS and "/" in name:
        return "programs/" + name
    return None


def complaint(path, quote, name):
    """What is wrong with this include in this file; None if nothing is."""
    if ".." in name.split("/"):
        return "climbs out of its folder"
    if name == "sqlite3.h":
        allowed = any(fnmatch.fnmatchcase(path, one) for one in SQLITE_USERS)
        return None if allowed else "goes past the platform's database interface"
    target = path_of(quote, name)
    if target is None:
        return None  # of the system, or beside the including file
    here, there = layer_of(path), layer_of(target)
    if there is None:
        return "is in no layer; add it to tests/sources/layers_test.py"
    if here.startswith("programs/") and name.startswith("internal/"):
        return "is no public header"
    if there != here and there not in LAYERS[here][1]:
        return f"the layer '{here}' must not know the layer '{there}'"
    return None


# Examples of what must be found, and of what must not: the check itself is checked first.
FORBIDDEN = [
    ("record/entry.cpp", "<", "tuvosharing/entry_db.h"),
    ("record/token.cpp", "<", "tuvosharing/base_db.h"),
    ("include/tuvosharing/base_db.h", "<", "tuvosharing/object.h"),
    ("db/entry_db.cpp", "<", "tuvosharing/login.h"),
    ("db/object_db.cpp", "<", "tuvosharing/token_db.h"),
    ("db/object_db.cpp", "<", "tuvoplatform/database.h"),
    ("platform/src/account.cpp", "<", "tuvosharing/utils.h"),
    ("platform/src/account.cpp", "<", "internal/log.h"),
    ("programs/visitor/main.cpp", "<", "internal/log.h"),
    ("programs/visitor/main.cpp", '"', "../../include/internal/log.h"),
    ("login/sharinglogin.cpp", "<", "sqlite3.h"),
    ("utils/log.cpp", "<", "internal/not_there.h"),
    ("programs/webapi/main.cpp", '"', "cli/create.h"),
    ("programs/visitor/main.cpp", '"', "owner/settings.h"),
    ("programs/owner/account.cpp", '"', "webapi/handler.h"),
    ("programs/common/gateway.cpp", '"', "visitor/route.h"),
]
ALLOWED = [
    ("login/sharinglogin.cpp", "<", "tuvosharing/entry_db.h"),
    ("db/entry_db.cpp", "<", "tuvosharing/object_db.h"),
    ("db/base_db.cpp", "<", "sqlite3.h"),
    ("programs/visitor/main.cpp", "<", "tuvosharing/login.h"),
    ("programs/visitor/main.cpp", '"', "route.h"),
    ("programs/visitor/main.cpp", '"', "common/gateway.h"),
    ("programs/webapi/main.cpp", '"', "owner/settings.h"),
    ("record/entry.cpp", "<", "string"),
]


def main():
    project = pathlib.Path(sys.argv[1])
    failures = [f"not found: {case}" for case in FORBIDDEN if complaint(*case) is None]
    failures += [f"wrongly found: {case}" for case in ALLOWED if complaint(*case) is not None]
    includes = 0
    for folder in FOLDERS:
        for file in sorted((project / folder).rglob("*")):
            if file.suffix not in (".cpp", ".c", ".h"):
                continue
            path = file.relative_to(project).as_posix()
            if layer_of(path) is None:
                failures.append(f"{path} is in no layer; add it to tests/sources/layers_test.py")
                continue
            for quote, name in INCLUDE.findall(file.read_text(encoding="utf-8")):
                includes += 1
                reason = complaint(path, quote, name)
                if reason:
                    failures.append(f"{path}: {name}: {reason}")
    print("\n".join(failures + [f"{includes} includes read, {len(failures)} failures"]))
    return 1 if failures or includes == 0 else 0


if __name__ == "__main__":
    sys.exit(main())
