/**
 * @file
 * @brief Collects the library's log lines, for tests that look at them.
 *
 * A program that is linked with libqel-message-testlog.a and calls one of these functions has a
 * __dlog_print of its own, which keeps lines instead of writing them. The lines are those of the
 * whole process. They may come from several threads at once; the functions below are called when
 * none is in a call.
 */
#ifndef QEL_TESTLOG_H
#define QEL_TESTLOG_H

#ifdef __cplusplus
extern "C" {
#endif

/**
 * How many lines have the text in them. A line begins with the letter of its priority, V, D, I, W,
 * E or F, and its tag, for example "E MESSAGE_PLUGIN: msgType is out of range(0~6)". A line for
 * which there was no memory is missing.
 *
 * @param text  what to look for; NULL for every line
 * @return their number
 */
int qel_testlog_count(const char* text);

/**
 * The first line that has the text in it, up to its first line break.
 *
 * @param text  what to look for; NULL for every line
 * @return a text that is valid until qel_testlog_clear(), or NULL if there is none
 */
const char* qel_testlog_find(const char* text);

/** Forgets all lines. What qel_testlog_find() has returned is no longer valid. */
void qel_testlog_clear(void);

#ifdef __cplusplus
}
#endif

#endif
