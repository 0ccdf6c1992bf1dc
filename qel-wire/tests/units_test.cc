// What the program's sessions cannot show, or only one by one.

#include <gtest/gtest.h>

#include <string>

#include "misread.h"
#include "notation.h"
#include "schema.h"
#include "text.h"
#include "walk.h"

namespace {

using qel_wire::from_notation;
using qel_wire::Notation;

// Of each kind the first and the last: C0 and DEL, C1, marks of direction, separators of lines.
TEST(Readable, CharactersThatATerminalObeys_AreEscaped) {
  for (const char* bytes : {"01", "1f", "7f", "c2 80", "c2 9f", "d8 9c", "e2 80 8e", "e2 80 8f",
                            "e2 80 a8", "e2 80 ae", "e2 81 a6", "e2 81 a9", "ef bb bf"}) {
    const std::string text = from_notation(bytes, Notation::kHex);
    EXPECT_EQ(qel_wire::readable(text).find(text), std::string::npos) << bytes;
  }
}

// Their neighbours.
TEST(Readable, CharactersThatATerminalShows_StayAsTheyAre) {
  for (const char* bytes : {"20", "7e", "c2 a0", "d8 9b", "e2 80 8d", "e2 80 90", "e2 80 a7",
                            "e2 80 af", "e2 81 a5", "ef bb be", "f0 9f 98 80"}) {
    const std::string text = from_notation(bytes, Notation::kHex);
    EXPECT_EQ(qel_wire::readable(text), text) << bytes;
  }
}

TEST(Utf8, AtItsBounds_IsTaken) {
  for (const char* text : {"", "a", "\xc2\x80", "\xdf\xbf", "\xe0\xa0\x80", "\xed\x9f\xbf",
                           "\xee\x80\x80", "\xf0\x90\x80\x80", "\xf4\x8f\xbf\xbf"}) {
    EXPECT_TRUE(qel_wire::is_utf8(text)) << testing::PrintToString(text);
  }
}

// Overlong, surrogates, too large, a lead or a continuation without the other.
TEST(Utf8, BeyondItsBounds_IsRefused) {
  for (const char* text :
       {"\xc0\x80", "\xc1\xbf", "\xe0\x9f\xbf", "\xf0\x8f\xbf\xbf", "\xed\xa0\x80", "\xed\xbf\xbf",
        "\xf4\x90\x80\x80", "\xf8\x88\x80\x80\x80", "\x80", "\xc2", "\xc2\x41", "\xe2\x80"}) {
    EXPECT_FALSE(qel_wire::is_utf8(text)) << testing::PrintToString(text);
  }
}

TEST(Walk, OfMoreThan64MiB_IsBroken) {
  const auto& type = *qel_wire::message_named("Result");
  qel_wire::Visitor nobody;
  std::string bytes("\x12\xfb\xff\xff\x1f", 5);  // a text of all that may follow
  bytes.resize(qel_wire::kMostBytes);
  EXPECT_FALSE(qel_wire::walk(bytes, type, &nobody).has_value());
  const auto problem = qel_wire::walk(bytes + '\0', type, &nobody);
  ASSERT_TRUE(problem.has_value());
  EXPECT_EQ(problem->reason, "more than 64 MiB, which no call takes");
}

// The reader notes in 64 bits which fields it has seen.
TEST(Schema, EveryMessage_HasAtMost64Fields) {
  const auto& file = qel_wire::schema_file();
  for (int i = 0; i < file.message_type_count(); ++i) {
    EXPECT_LE(file.message_type(i)->field_count(), 64) << file.message_type(i)->name();
  }
}

// Padded or not, of both alphabets, broken into lines.
TEST(Base64, OfEveryKind_IsRead) {
  for (const char* text : {"+/8BAg==", "+/8BAg", "-_8BAg==", "-_8BAg", "+/8B\nAg==\n"}) {
    EXPECT_EQ(from_notation(text, Notation::kBase64), "\xfb\xff\x01\x02") << text;
  }
}

TEST(Base64, ThatIsNone_IsRefused) {
  for (const char* text : {"A", "AB=C", "!!!!"}) {
    EXPECT_THROW(from_notation(text, Notation::kBase64), qel_wire::Misread) << text;
  }
}

}  // namespace
