/* Running the program that makes the root directory of a login. */
#ifndef VELT_STANDALONE_LOGIN_LOGIN_PROGRAM_H
#define VELT_STANDALONE_LOGIN_LOGIN_PROGRAM_H

#include <stddef.h>

/* Runs the program, an absolute path, with these arguments, an empty environment and no file of this process,
 * for at most `limit` seconds. 1 when it ended with 0; else 0. `words` gets, cut to its size of at least 2
 * and in one line of printable characters, what the program wrote on its standard error or, when it did not
 * get that far, why. */
int velt_run_login_program(char* const arguments[], int limit, char* words, size_t size);

#endif
