/* Running the program that makes the view of a login. */
#ifndef VELT_STANDALONE_LOGIN_LOGIN_PROGRAM_H
#define VELT_STANDALONE_LOGIN_LOGIN_PROGRAM_H

#include <stddef.h>

/* Runs arguments[0], an absolute path, with these arguments, an empty environment and none of this process's
 * files, for at most `limit` seconds. What it wrote to its standard output tells what the view shows
 * (standalone/activity/shown_places.h). 1 when it ended with status 0, else 0. `words` gets what the program
 * wrote to its standard error or, after a failure without that, the reason: one line of printable characters,
 * cut to `size`, which is at least 2. */
int velt_run_login_program(char* const arguments[], int limit, char* words, size_t size);

#endif
