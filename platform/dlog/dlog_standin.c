/*
 * The workstation's __dlog_print: one line per call on standard error,
 *
 *   10:31:07.251 W MESSAGE_PLUGIN P1234 T1234: text
 *
 * with the local time, the priority's letter, the tag, the process and the thread. Colour escapes
 * are printed on a terminal, unless NO_COLOR is set and not empty, and removed elsewhere. A line
 * break inside the text is shown as "\n", so that each call prints one line. What does not fit in a
 * line of 4096 bytes is cut off, as on the device.
 *
 * The environment variable DLOG_STANDIN_PRIORITY may hold one of the letters below: the lowest
 * priority that is printed, or S to print nothing. If it is empty or begins with another character,
 * everything is printed.
 */
#define _GNU_SOURCE
#include <stdarg.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/syscall.h>
#include <time.h>
#include <unistd.h>

#define LINE_LENGTH 4096

/* A letter for each priority, from 0. */
static const char priority_letters[] = "??VDIWEFS";

static const char end_of_colour[] = "\033[0m";

int __dlog_print(int log_id, int priority, const char* tag, const char* format, ...)
    __attribute__((format(printf, 4, 5)));

static char priority_letter(int priority) {
  if (priority < 0 || priority >= (int)sizeof(priority_letters) - 1) {
    return priority_letters[0];
  }
  return priority_letters[priority];
}

static int is_printed(int priority) {
  const char* least = getenv("DLOG_STANDIN_PRIORITY");
  const char* letter = least != NULL && *least != '\0' ? strchr(priority_letters, *least) : NULL;
  return letter == NULL || priority >= letter - priority_letters;
}

static int has_colours(void) {
  const char* no_color = getenv("NO_COLOR");
  return (no_color == NULL || *no_color == '\0') && isatty(STDERR_FILENO);
}

/* The character after the colour escape at text, or text if there is none. */
static const char* skip_colour(const char* text) {
  const char* end;
  if (text[0] != '\033' || text[1] != '[') {
    return text;
  }
  end = text + 2 + strspn(text + 2, "0123456789;");
  return *end == 'm' ? end + 1 : text;
}

/* Appends text to the line from position at on, ready for output; returns the new position. */
static size_t append_text(char* line, size_t at, const char* text, int with_colours) {
  const size_t limit = LINE_LENGTH - sizeof end_of_colour - 2; /* and a two-character "\n" */
  while (*text != '\0' && at < limit) {
    const char* after = skip_colour(text);
    if (after != text && !with_colours) {
      text = after;
    } else if (*text == '\n') {
      line[at++] = '\\';
      line[at++] = 'n';
      ++text;
    } else {
      line[at++] = *text++;
    }
  }
  if (*text != '\0' && with_colours) { /* the end of the colour was cut off */
    memcpy(line + at, end_of_colour, sizeof end_of_colour - 1);
    at += sizeof end_of_colour - 1;
  }
  return at;
}

int __dlog_print(int log_id, int priority, const char* tag, const char* format, ...) {
  char text[LINE_LENGTH] = "";
  char line[LINE_LENGTH + 1];
  struct timespec now;
  struct tm local;
  va_list arguments;
  int head;
  size_t length;

  (void)log_id; /* there is one buffer here */
  if (!is_printed(priority)) {
    return 0;
  }
  va_start(arguments, format);
  vsnprintf(text, sizeof text, format, arguments);
  va_end(arguments);

  clock_gettime(CLOCK_REALTIME, &now);
  localtime_r(&now.tv_sec, &local);
  head = snprintf(line, LINE_LENGTH / 2, "%02d:%02d:%02d.%03ld %c %s P%d T%ld: ", local.tm_hour,
                  local.tm_min, local.tm_sec, now.tv_nsec / 1000000, priority_letter(priority), tag,
                  (int)getpid(), syscall(SYS_gettid));
  if (head >= LINE_LENGTH / 2) {
    head = LINE_LENGTH / 2 - 1; /* a very long tag */
  }
  length = append_text(line, (size_t)head, text, has_colours());
  line[length++] = '\n';
  /* One write, so that lines of several threads and processes do not mix. */
  return (int)write(STDERR_FILENO, line, length);
}
