"""What is measured, and what it may cost."""

import dataclasses

SMALL, MIDDLE, LARGE = 1_000, 100_000, 1_000_000
EXPIRED = 100_000


@dataclasses.dataclass(frozen=True)
class Row:
    name: str
    operation: str  # what the measuring programs call it
    links: int = MIDDLE
    expired: int = 0  # so many links, sessions and tokens more are over
    cpu_target: float | None = None  # at most so many times the floor's CPU time
    memory_target: float | None = None  # the peak, at most so many times what is kept
    most: int = 400  # iterations in one run
    json: bool = False  # the floor parses the links' JSON as well
    process: bool = False  # from exec to exit
    pairs: int | None = None  # rather than the usual number
    countable: bool = True  # callgrind would take minutes for the others

    @property
    def once(self):
        """Whether the operation can be done on a database only once."""
        return self.expired > 0


REQUEST, LISTING, PURGE, PROCESS = 1.15, 1.3, 1.05, 1.25
# At a million links, beyond what the floor itself grows from a thousand on.
GROWTH = 1.15

ROWS = [
    Row("check 1k", "check", links=SMALL, cpu_target=REQUEST),
    Row("check", "check", cpu_target=REQUEST),
    Row("check 1M", "check", links=LARGE, cpu_target=REQUEST),
    Row("login_open", "login_open", cpu_target=REQUEST),
    Row("login_password", "login_password", cpu_target=REQUEST),
    Row("count_use", "count_use", cpu_target=REQUEST),
    Row("logout", "logout", cpu_target=REQUEST),
    Row("create", "create", cpu_target=REQUEST),
    Row("page", "page", cpu_target=LISTING, json=True),
    Row("query", "query", cpu_target=LISTING, memory_target=1.5, json=True, most=1,
        pairs=5, countable=False),
    Row("purge_entries idle", "purge_entries", cpu_target=PURGE, most=5000),
    Row("purge_sessions idle", "purge_sessions", cpu_target=PURGE, most=5000),
    Row("purge_tokens idle", "purge_tokens", cpu_target=PURGE, most=5000),
    # One after another on one database, in the order in which none does the next one's work.
    Row("purge_tokens 100k", "purge_tokens", links=SMALL, expired=EXPIRED, cpu_target=PURGE,
        most=1, pairs=5, countable=False),
    Row("purge_sessions 100k", "purge_sessions", links=SMALL, expired=EXPIRED, cpu_target=PURGE,
        most=1, pairs=5, countable=False),
    Row("purge_entries 100k", "purge_entries", links=SMALL, expired=EXPIRED, cpu_target=PURGE,
        most=1, pairs=5, countable=False),
    Row("fresh_process", "check", cpu_target=PROCESS, process=True, most=60),
    # Beside a floor that loads the C++ library and jsoncpp, which any program with records does.
    Row("fresh_process C++", "check", process=True, json=True, most=60),
]
