/*
 * plugin.h - a plug-in for the tests of the kit: it does everything once, answers what the service
 * sends of its own accord, and gives up what is not answered in time. It can be given one mistake.
 */
#ifndef TESTKIT_TESTS_PLUGIN_H
#define TESTKIT_TESTS_PLUGIN_H

#include "qel-message.h"

#ifdef __cplusplus
extern "C" {
#endif

typedef enum {
  BUG_NONE,
  BUG_ECHO_UNANSWERED,
  BUG_ECHO_WITH_ANOTHER_ID,
  BUG_FAILURE_IS_SUCCESS,
  BUG_BROKEN_IS_SUCCESS,
  BUG_REFUSED_USERS_ARE_FAILURE,
  BUG_COUNT_WITHOUT_ARRAY,
  BUG_ANY_REPLY_FITS,
  BUG_TEXT_IS_REQUIRED,
  BUG_ONLY_TEXTS_ARE_ACKNOWLEDGED,
  BUG_SKIPPED_IS_ACKNOWLEDGED,
  BUG_SENDER_OF_BEFORE,
  BUG_PAGE_KEY_LOST,
  BUG_PAGES_WITHOUT_END,
  BUG_SAME_ID_AGAIN,
  BUG_COUNT /* how many there are, and none */
} bug_t;

typedef struct plugin {
  bug_t bug;
  void (*send)(void* context, const char* message, const unsigned char* data, int size);
  void* context;

  int step;
  int64_t request_id; /* the last */
  bool is_repeated;   /* the step's request was sent before */
  int timer;          /* milliseconds until the step is given up, or 0 if it does not wait */
  int pages;
  int64_t chatroom;
  int64_t pushed_message; /* the last, or 0 */
  int64_t pushed_sender;
  int64_t pushed_time;
} plugin_t;

/* Of a plug-in that is zeroed, but for its first three members. */
void plugin_start(plugin_t* plugin);
void plugin_receive(plugin_t* plugin, const char* message, const unsigned char* data, int size);
void plugin_wait(plugin_t* plugin, int milliseconds);

#ifdef __cplusplus
}
#endif

#endif
