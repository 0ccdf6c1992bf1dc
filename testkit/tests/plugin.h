/*
 * plugin.h - plug-ins for the tests of the kit: they do everything once, answer what the service
 * sends of its own accord, and give up what is not answered in time. The two good ones have nothing
 * in common that the service does not require. Either can be given one mistake.
 */
#ifndef TESTKIT_TESTS_PLUGIN_H
#define TESTKIT_TESTS_PLUGIN_H

#include "qel-message.h"

#ifdef __cplusplus
extern "C" {
#endif

typedef enum {
  ONE_BY_ONE,  /* waits for each reply */
  ALL_AT_ONCE, /* sends what needs no reply of before */
  MANNER_COUNT
} manner_t;

typedef enum {
  BUG_NONE,
  BUG_SAME_ID_AGAIN,
  BUG_WAITS_FOR_EVER,
  /* the login */
  BUG_USER_AND_DEVICE_SWAPPED,
  BUG_ANOTHER_USER,
  BUG_EMPTY_APP_ID,
  BUG_LOGIN_NOT_AWAITED,
  /* replies */
  BUG_FAILED_LOGIN_IS_SUCCESS,
  BUG_FAILURE_IS_SUCCESS, /* of any other request */
  BUG_BROKEN_IS_SUCCESS,
  BUG_REFUSED_USERS_ARE_FAILURE,
  BUG_TEXT_IS_REQUIRED,
  BUG_WHOLE_REPLY_IS_REQUIRED,
  BUG_DEAF_AFTER_GIVING_UP,
  BUG_ANY_LOGIN_FITS,
  BUG_ANY_CHATROOM_FITS,
  BUG_ANY_CHAT_REPLY_FITS,
  BUG_ANY_CHANGE_FITS,
  /* what the service sends of its own accord */
  BUG_ECHO_UNANSWERED,
  BUG_ECHO_WITH_ANOTHER_ID,
  BUG_ECHO_ANSWERED_TWICE,
  BUG_ECHO_OF_ITS_OWN,
  BUG_ONLY_TEXTS_ARE_ACKNOWLEDGED,
  BUG_SKIPPED_IS_ACKNOWLEDGED,
  BUG_ACKNOWLEDGED_TWICE,
  BUG_BROKEN_IS_ACKNOWLEDGED,
  BUG_ACKNOWLEDGED_ELSEWHERE,
  BUG_SENDER_OF_BEFORE,
  BUG_PAGE_KEY_LOST,
  BUG_PAGES_WITHOUT_END,
  /* requests */
  BUG_MESSAGE_ID_0,
  BUG_SAME_MESSAGE_ID,
  BUG_REPEATED_AS_ANOTHER,
  BUG_EMPTY_TEXT,
  BUG_TEXT_IN_LATIN_1,
  BUG_NEGATIVE_LIFETIME,
  BUG_UNKNOWN_IS_UNSEALED,
  BUG_UNSEALED_SWAPPED,
  BUG_CALL_SWAPPED,
  BUG_CALL_IN_MILLISECONDS,
  BUG_TYPING_WITHOUT_STATE,
  BUG_NOBODY_INVITED,
  BUG_LEAVES_ANOTHER_CHATROOM,
  BUG_LEAVES_NO_CHATROOM,
  /* that qel-message.h does not let happen */
  BUG_COUNT_WITHOUT_ARRAY,
  BUG_MEMORY_LOST,
  BUG_NUMBER_OUTSIDE_ENUMERATION
} bug_t;

enum {
  STEP_SIGN_IN,
  STEP_CLOCK,
  STEP_CREATE,
  STEP_ENTER,
  STEP_CHAT,
  STEP_CHAT_AGAIN,
  STEP_READ,
  STEP_UNREAD,
  STEP_UNSEAL,
  STEP_TYPING,
  STEP_CALL,
  STEP_TITLE,
  STEP_LIFETIME,
  STEP_INVITE,
  STEP_END,
  STEP_COUNT
};

typedef struct plugin {
  manner_t manner;
  bug_t bug;
  int left_out; /* steps: a bit for each, as in all sets of them */
  void (*send)(void* context, const char* message, const unsigned char* data, int size);
  void* context;

  int begun, settled, repeated;
  int64_t request_ids[STEP_COUNT]; /* each step's last */
  int timers[STEP_COUNT];          /* milliseconds until it is given up; 0: never */
  int64_t next_id;
  int pages;
  bool has_given_up;
  int64_t chatroom;                /* the one that it created */
  qel_message_inboxentry_t pushed; /* the last, without its text */
} plugin_t;

/* Of a plug-in that is zeroed, but for its first five members. */
void plugin_start(plugin_t* plugin);
void plugin_receive(plugin_t* plugin, const char* message, const unsigned char* data, int size);
void plugin_wait(plugin_t* plugin, int milliseconds);

/* In how many milliseconds it gives something up; 0 if it waits for nothing. */
int plugin_timer(const plugin_t* plugin);

#ifdef __cplusplus
}
#endif

#endif
