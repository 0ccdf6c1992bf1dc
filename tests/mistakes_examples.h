/* The functions that docs/mistakes.md shows, wrong ones and right ones, as the tests call them. */
#ifndef TESTS_MISTAKES_EXAMPLES_H
#define TESTS_MISTAKES_EXAMPLES_H

#include "qel-message-serialize.h"

#ifdef __cplusplus
extern "C" {
#endif

bool typing_if_it_can_be_read(const unsigned char* data, int size);
bool typing_if_it_is_called_so(const char* name, const unsigned char* data, int size);

bool clock_of_any_bytes(const unsigned char* data, int size, int64_t* now);
bool clock_of_a_reply(const unsigned char* data, int size, int64_t* now);
bool typing_by_its_length(int64_t chatroom, unsigned char** data, int* size);
bool typing_by_its_buffer(int64_t chatroom, unsigned char** data, int* size);
bool chat_by_its_buffer(const char* text, unsigned char** data, int* size);
bool chat_by_its_status(const char* text, unsigned char** data, int* size);

bool logged_in_by_the_code(const unsigned char* data, int size);
bool logged_in_by_the_reply(const char* name, const unsigned char* data, int size, int64_t request);

int64_t sum_of_counted_receivers(const unsigned char* data, int size);
int64_t sum_of_listed_receivers(const unsigned char* data, int size, int* count);

bool asks_for_a_page_by_an_old_key(const unsigned char* page, int size, char** key);
bool asks_for_a_page_by_its_key(const unsigned char* page, int size, char** key);
int code_of_the_last_result(const unsigned char* data, int size);
int code_of_this_result(const unsigned char* data, int size);

int members_of_a_leaking_reply(const unsigned char* data, int size);
int members_of_a_reply(const unsigned char* data, int size);
void next_push_over_the_last(const unsigned char* data, int size, qel_message_inboxentry_t* last);
void next_push_instead_of_the_last(const unsigned char* data, int size,
                                   qel_message_inboxentry_t* last);

int chat_of_any_type(int type, const char* text, unsigned char** data, int* size);
int chat_of_a_type(int type, const char* text, unsigned char** data, int* size);
int chatroom_of_a_type(int type, int64_t receiver, unsigned char** data, int* size);
bool typing_of_a_type(int type, unsigned char** data, int* size);

const char* shown_by_its_type(const qel_message_inboxentry_t* message);
const char* shown_by_its_text(const qel_message_inboxentry_t* message);

#ifdef __cplusplus
}
#endif

#endif
