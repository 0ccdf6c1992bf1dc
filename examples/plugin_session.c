/*
 * A message plug-in's session with the service, in plain C: it authenticates its channel, reads the
 * service's clock, answers the service's echo probes whenever they come, and sends chat messages.
 *
 *   plugin_session PORT [--access-token TEXT] [--timeout SECONDS]
 *
 * talks to the front end that listens on that port of 127.0.0.1, and gives it so long for each
 * reply. Exits with 0 if every exchange went as it should, with 1 otherwise, and with 2 if it was
 * called wrongly.
 */
#define _POSIX_C_SOURCE 200809L
#include <arpa/inet.h>
#include <netinet/in.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/socket.h>
#include <time.h>
#include <unistd.h>

#include "framing.h"
#include "qel-message-serialize.h"

/* The whole session takes no longer, whatever the front end does. */
enum { SESSION_SECONDS = 60 };

/* One byte more than the library sends. */
enum { TOO_LONG = 40001 };

/* What an output is set to before a call, to see whether the call wrote it: no id or code of the
   service's. */
enum { NOT_WRITTEN = -4711 };

/* The service's code for success. */
enum { RESULT_OK = 0 };

static int64_t last_request_id = 0;

static int failed(const char* what) {
  fprintf(stderr, "plug-in: %s\n", what);
  return -1;
}

/* Sends what a serializer handed out, and releases it. status is what the serializer returned. */
static int send_message(int connection, const char* name, int status, unsigned char* message,
                        int size) {
  int sent;
  if (status != 0) {
    return failed("a message could not be built");
  }
  sent = frame_send(connection, name, message, size);
  free(message);
  return sent == 0 ? 0 : failed("a message could not be sent");
}

/* The service probes whether the client is alive; the answer carries the probe's requestId. */
static int answer_echo(int connection, const frame_t* echo) {
  int64_t request_id = NOT_WRITTEN;
  unsigned char* message = NULL;
  int size = 0;
  int status;

  client_echo_deserialize(echo->message, echo->size, &request_id);
  if (request_id == NOT_WRITTEN) {
    return failed("the echo probe could not be parsed");
  }
  printf("plug-in: echo probe %lld\n", (long long)request_id);
  status = client_echo_reply_serialize(request_id, &message, &size);
  return send_message(connection, "ClientEchoReply", status, message, size);
}

/* Waits for a reply, and answers the pushes that come before it. On success the caller releases
   reply->message. */
static int await_reply(int connection, const char* name, frame_t* reply) {
  for (;;) {
    int status;
    if (frame_receive(connection, reply) != 1) {
      return failed("the connection ended or fell silent where a reply was due");
    }
    if (strcmp(reply->name, name) == 0) {
      return 0;
    }
    if (strcmp(reply->name, "ClientEcho") != 0) {
      free(reply->message);
      return failed("a message came that was not expected");
    }
    status = answer_echo(connection, reply);
    free(reply->message);
    if (status != 0) {
      return -1;
    }
  }
}

/* Prints a reply's outcome, and releases its text. The outputs tell how the parse went: an id that
   is not written means that it failed, and a text that is not that the reply has no whole result.
 */
static int check_result(const char* what, int64_t request_id, int code, char* text) {
  if (request_id == NOT_WRITTEN) {
    return failed("the reply could not be parsed");
  }
  if (text == NULL) {
    return failed("the reply does not say how it went");
  }
  printf("plug-in: %s: result %d, \"%s\"\n", what, code, text);
  free(text);
  if (request_id != last_request_id) {
    return failed("the reply belongs to another request");
  }
  return code == RESULT_OK ? 0 : failed("the service refused the request");
}

static int authenticate(int connection, const char* access_token) {
  unsigned char* message = NULL;
  int size = 0;
  frame_t reply;
  int64_t request_id = NOT_WRITTEN;
  int code = NOT_WRITTEN;
  char* text = NULL;
  int status = channel_auth_request_serialize(++last_request_id, 5001, 77, "org.example.chat",
                                              access_token, &message, &size);

  if (send_message(connection, "ChannelAuthRequest", status, message, size) != 0 ||
      await_reply(connection, "ChannelAuthReply", &reply) != 0) {
    return -1;
  }
  channel_auth_reply_deserialize(reply.message, reply.size, &request_id, &code, &text);
  free(reply.message);
  return check_result("channel authentication", request_id, code, text);
}

static int read_clock(int connection) {
  unsigned char* message = NULL;
  int size = 0;
  frame_t reply;
  int64_t request_id = NOT_WRITTEN;
  int64_t now_millis = NOT_WRITTEN;
  int code = NOT_WRITTEN;
  char* text = NULL;
  char printed[32] = "unknown";
  int status = current_time_request_serialize(++last_request_id, &message, &size);

  if (send_message(connection, "CurrentTimeRequest", status, message, size) != 0 ||
      await_reply(connection, "CurrentTimeReply", &reply) != 0) {
    return -1;
  }
  current_time_deserialize(reply.message, reply.size, &request_id, &now_millis, &code, &text);
  free(reply.message);
  if (check_result("current time", request_id, code, text) != 0) {
    return -1;
  }
  if (now_millis >= 0) {
    time_t seconds = (time_t)(now_millis / 1000);
    struct tm utc;
    strftime(printed, sizeof printed, "%Y-%m-%d %H:%M:%S UTC", gmtime_r(&seconds, &utc));
  }
  printf("plug-in: the service's clock says %s\n", printed);
  return 0;
}

static int send_chat_message(int connection, int64_t chatroom, int64_t message_id,
                             const char* text_to_send) {
  const int type_text = 0;
  const int lifetime = 0;
  unsigned char* message = NULL;
  int size = 0;
  frame_t reply;
  int64_t request_id = NOT_WRITTEN;
  int64_t replied_chatroom = NOT_WRITTEN;
  int code = NOT_WRITTEN;
  char* text = NULL;
  int count = 0;
  int64_t* ids = NULL;
  int64_t* times = NULL;
  int confirmed = 0;
  int i;
  int status = chat_request_serialize(++last_request_id, chatroom, message_id, type_text,
                                      text_to_send, lifetime, 0, &message, &size);

  if (send_message(connection, "ChatRequest", status, message, size) != 0 ||
      await_reply(connection, "ChatReply", &reply) != 0) {
    return -1;
  }
  chat_reply_deserialize(reply.message, reply.size, &request_id, &replied_chatroom, &code, &text,
                         &count, &ids, &times);
  free(reply.message);
  status = check_result("chat message", request_id, code, text);
  for (i = 0; i < count; ++i) {
    printf("plug-in: message %lld recorded at %lld\n", (long long)ids[i], (long long)times[i]);
    confirmed = confirmed || ids[i] == message_id;
  }
  free(ids);
  free(times);
  if (status != 0) {
    return -1;
  }
  return confirmed && replied_chatroom == chatroom
             ? 0
             : failed("the service did not confirm the message");
}

/* The library refuses a text of more than 40000 bytes; nothing is sent then. */
static int try_too_long_message(void) {
  unsigned char* message = NULL;
  int size = 0;
  int status;
  char* text = malloc(TOO_LONG + 1);
  if (text == NULL) {
    return failed("out of memory");
  }
  memset(text, 'x', TOO_LONG);
  text[TOO_LONG] = '\0';
  status = chat_request_serialize(last_request_id + 1, 42, 9003, 0, text, 0, 0, &message, &size);
  free(text);
  if (status == 0) {
    free(message);
    return failed("a text of 40001 bytes was accepted");
  }
  printf("plug-in: a text of %d bytes is too long and was not sent\n", TOO_LONG);
  return 0;
}

static int run_session(int connection, const char* access_token) {
  if (authenticate(connection, access_token) != 0 || read_clock(connection) != 0 ||
      send_chat_message(connection, 42, 9001, "Hello from the plug-in") != 0 ||
      send_chat_message(connection, 42, 9002,
                        "Gr\xc3\xbc\xc3\x9f"
                        "e \xe2\x98\x95") != 0 ||
      try_too_long_message() != 0) {
    return -1;
  }
  printf("plug-in: session complete\n");
  return 0;
}

static int connect_to(int port, int timeout_seconds) {
  struct sockaddr_in address;
  int connection = socket(AF_INET, SOCK_STREAM, 0);
  memset(&address, 0, sizeof address);
  address.sin_family = AF_INET;
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  address.sin_port = htons((uint16_t)port);
  if (connection < 0 || connect(connection, (struct sockaddr*)&address, sizeof address) != 0 ||
      frame_set_timeout(connection, timeout_seconds) != 0) {
    perror("plug-in: connection to the front end");
    if (connection >= 0) {
      close(connection);
    }
    return -1;
  }
  return connection;
}

/* Ends the program. */
static void usage(void) {
  fprintf(stderr, "usage: plugin_session PORT [--access-token TEXT] [--timeout SECONDS]\n");
  exit(2);
}

/* A number of 1 to most; ends the program if the text is none. */
static int parse_number(const char* text, long most) {
  char* end = NULL;
  const long number = strtol(text, &end, 10);
  if (end == text || *end != '\0' || number < 1 || number > most) {
    usage();
  }
  return (int)number;
}

int main(int argc, char** argv) {
  const char* access_token = "example-access-token";
  int timeout_seconds = 10;
  int port;
  int connection;
  int status;
  int i;

  if (argc < 2 || argc % 2 != 0) {
    usage();
  }
  port = parse_number(argv[1], 65535);
  for (i = 2; i < argc; i += 2) {
    if (strcmp(argv[i], "--access-token") == 0) {
      access_token = argv[i + 1];
    } else if (strcmp(argv[i], "--timeout") == 0) {
      timeout_seconds = parse_number(argv[i + 1], SESSION_SECONDS);
    } else {
      usage();
    }
  }
  setvbuf(stdout, NULL, _IOLBF, 0); /* in step with the log and the front end */
  alarm(SESSION_SECONDS);

  connection = connect_to(port, timeout_seconds);
  if (connection < 0) {
    return 1;
  }
  status = run_session(connection, access_token);
  close(connection);
  return status == 0 ? 0 : 1;
}
