-- A database of version 0: a file that was made, and in which nothing was written yet.
PRAGMA user_version = 0;
