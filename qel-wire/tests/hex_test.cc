// The forms of hex that the tools of the trade print, each as they print it, and what is none.

#include "hex.h"

#include <gtest/gtest.h>

#include <iomanip>
#include <ostream>
#include <sstream>
#include <string>
#include <string_view>
#include <vector>

#include "misread.h"

namespace {

using qel_wire::from_hex;

// "LINE:COLUMN: REASON" if it is refused.
std::string outcome(std::string_view text) {
  std::ostringstream result;
  try {
    for (const char byte : from_hex(text)) {
      result << std::hex << std::setfill('0') << std::setw(2)
             << static_cast<unsigned>(static_cast<unsigned char>(byte));
    }
  } catch (const qel_wire::Misread& misread) {
    result << misread.line << ':' << misread.column << ": " << misread.reason;
  }
  return result.str();
}

struct Form {
  const char* name;
  std::string text;
  std::string bytes;
};

std::string name_of(const testing::TestParamInfo<Form>& form) {
  return form.param.name;
}

void PrintTo(const Form& form, std::ostream* stream) {
  *stream << form.name;
}

// 83 bytes: rows that repeat, one of characters that look like hex, an odd rest.
constexpr char kSample[] =
    "0807602a6a0708e90712026f6b000000"
    "00000000000000000000000000000000"
    "00000000000000000000000000000000"
    "00000000000000000000000000000000"
    "61622063642031322033342035363738"
    "0aff41";

constexpr char kMessage[] = "0807602a6a0708e90712026f6b";

// A datagram of IP with the message, and characters that look like hex.
constexpr char kPacket[] =
    "4500003900010000401100000a000001"
    "0a00000212345678002500000807602a"
    "6a0708e90712026f6b61622063642031"
    "322033342035363738";

const std::vector<Form> kForms = {
    {"xxd",
     "00000000: 0807 602a 6a07 08e9 0712 026f 6b00 0000  ..`*j......ok...\n"
     "00000010: 0000 0000 0000 0000 0000 0000 0000 0000  ................\n"
     "00000020: 0000 0000 0000 0000 0000 0000 0000 0000  ................\n"
     "00000030: 0000 0000 0000 0000 0000 0000 0000 0000  ................\n"
     "00000040: 6162 2063 6420 3132 2033 3420 3536 3738  ab cd 12 34 5678\n"
     "00000050: 0aff 41                                  ..A\n",
     kSample},
    {"xxd_u", "00000000: 0807 602A 6A07 08E9 0712 026F 6B  ..`*j......ok\n", kMessage},
    {"xxd_c_and_g",
     "00000000: 08 07 60 2a 6a 07 08 e9  ..`*j...\n"
     "00000008: 07 12 02 6f 6b 00 00 00  ...ok...\n"
     "00000010: 00 00 00 00 00 00 00 00  ........\n"
     "00000018: 00 00 00 00 00 00 00 00  ........\n"
     "00000020: 00 00 00 00 00 00 00 00  ........\n"
     "00000028: 00 00 00 00 00 00 00 00  ........\n"
     "00000030: 00 00 00 00 00 00 00 00  ........\n"
     "00000038: 00 00 00 00 00 00 00 00  ........\n"
     "00000040: 61 62 20 63 64 20 31 32  ab cd 12\n"
     "00000048: 20 33 34 20 35 36 37 38   34 5678\n"
     "00000050: 0a ff 41                 ..A\n",
     kSample},
    {"xxd_g0",
     "00000000: 0807602a6a0708e90712026f6b000000  ..`*j......ok...\n"
     "00000010: 00000000000000000000000000000000  ................\n"
     "00000020: 00000000000000000000000000000000  ................\n"
     "00000030: 00000000000000000000000000000000  ................\n"
     "00000040: 61622063642031322033342035363738  ab cd 12 34 5678\n"
     "00000050: 0aff41                            ..A\n",
     kSample},
    {"xxd_a",
     "00000000: 0807 602a 6a07 08e9 0712 026f 6b00 0000  ..`*j......ok...\n"
     "00000010: 0000 0000 0000 0000 0000 0000 0000 0000  ................\n"
     "*\n"
     "00000040: 6162 2063 6420 3132 2033 3420 3536 3738  ab cd 12 34 5678\n"
     "00000050: 0aff 41                                  ..A\n",
     kSample},
    {"xxd_d",
     "00000000: 0807 602a 6a07 08e9 0712 026f 6b00 0000  ..`*j......ok...\n"
     "00000016: 0000 0000 0000 0000 0000 0000 0000 0000  ................\n"
     "00000032: 0000 0000 0000 0000 0000 0000 0000 0000  ................\n"
     "00000048: 0000 0000 0000 0000 0000 0000 0000 0000  ................\n"
     "00000064: 6162 2063 6420 3132 2033 3420 3536 3738  ab cd 12 34 5678\n"
     "00000080: 0aff 41                                  ..A\n",
     kSample},
    {"xxd_p",
     "0807602a6a0708e90712026f6b0000000000000000000000000000000000\n"
     "000000000000000000000000000000000000000000000000000000000000\n"
     "00000000616220636420313220333420353637380aff41\n",
     kSample},
    {"xxd_p_c",
     "0807602A6A0708E90712026F6B00000000000000\n"
     "0000000000000000000000000000000000000000\n"
     "0000000000000000000000000000000000000000\n"
     "0000000061622063642031322033342035363738\n"
     "0AFF41\n",
     kSample},
    {"hexdump_C",
     "00000000  08 07 60 2a 6a 07 08 e9  07 12 02 6f 6b 00 00 00  |..`*j......ok...|\n"
     "00000010  00 00 00 00 00 00 00 00  00 00 00 00 00 00 00 00  |................|\n"
     "*\n"
     "00000040  61 62 20 63 64 20 31 32  20 33 34 20 35 36 37 38  |ab cd 12 34 5678|\n"
     "00000050  0a ff 41                                          |..A|\n"
     "00000053\n",
     kSample},
    {"hexdump",
     "0000000 0708 2a60 076a e908 1207 6f02 006b 0000\n"
     "0000010 0000 0000 0000 0000 0000 0000 0000 0000\n"
     "*\n"
     "0000040 6261 6320 2064 3231 3320 2034 3635 3837\n"
     "0000050 ff0a 0041                              \n"
     "0000053\n",
     kSample},
    {"hexdump_x",
     "0000000    0708    2a60    076a    e908    1207    6f02    006b    0000\n"
     "0000010    0000    0000    0000    0000    0000    0000    0000    0000\n"
     "*\n"
     "0000040    6261    6320    2064    3231    3320    2034    3635    3837\n"
     "0000050    ff0a    0041                                                \n"
     "0000053\n",
     kSample},
    {"hexdump_b",
     "0000000 010 007 140 052 152 007 010 351 007 022 002 157 153 000 000 000\n"
     "0000010 000 000 000 000 000 000 000 000 000 000 000 000 000 000 000 000\n"
     "*\n"
     "0000040 141 142 040 143 144 040 061 062 040 063 064 040 065 066 067 070\n"
     "0000050 012 377 101                                                    \n"
     "0000053\n",
     kSample},
    {"od",
     "0000000 003410 025140 003552 164410 011007 067402 000153 000000\n"
     "0000020 000000 000000 000000 000000 000000 000000 000000 000000\n"
     "*\n"
     "0000100 061141 061440 020144 031061 031440 020064 033065 034067\n"
     "0000120 177412 000101\n"
     "0000123\n",
     kSample},
    {"od_x",
     "0000000 0708 2a60 076a e908 1207 6f02 006b 0000\n"
     "0000020 0000 0000 0000 0000 0000 0000 0000 0000\n"
     "*\n"
     "0000100 6261 6320 2064 3231 3320 2034 3635 3837\n"
     "0000120 ff0a 0041\n"
     "0000123\n",
     kSample},
    {"od_tx1",
     "0000000 08 07 60 2a 6a 07 08 e9 07 12 02 6f 6b 00 00 00\n"
     "0000020 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00\n"
     "*\n"
     "0000100 61 62 20 63 64 20 31 32 20 33 34 20 35 36 37 38\n"
     "0000120 0a ff 41\n"
     "0000123\n",
     kSample},
    {"od_tx1_Ax",
     "000000 08 07 60 2a 6a 07 08 e9 07 12 02 6f 6b 00 00 00\n"
     "000010 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00\n"
     "*\n"
     "000040 61 62 20 63 64 20 31 32 20 33 34 20 35 36 37 38\n"
     "000050 0a ff 41\n"
     "000053\n",
     kSample},
    {"od_tx1_Ad",
     "0000000 08 07 60 2a 6a 07 08 e9 07 12 02 6f 6b 00 00 00\n"
     "0000016 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00\n"
     "*\n"
     "0000064 61 62 20 63 64 20 31 32 20 33 34 20 35 36 37 38\n"
     "0000080 0a ff 41\n"
     "0000083\n",
     kSample},
    {"od_tx1_An",
     " 08 07 60 2a 6a 07 08 e9 07 12 02 6f 6b 00 00 00\n"
     " 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00\n"
     " 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00\n"
     " 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00\n"
     " 61 62 20 63 64 20 31 32 20 33 34 20 35 36 37 38\n"
     " 0a ff 41\n",
     kSample},
    {"od_tx1z",
     "0000000 08 07 60 2a 6a 07 08 e9 07 12 02 6f 6b 00 00 00  >..`*j......ok...<\n"
     "0000020 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00  >................<\n"
     "*\n"
     "0000100 61 62 20 63 64 20 31 32 20 33 34 20 35 36 37 38  >ab cd 12 34 5678<\n"
     "0000120 0a ff 41                                         >..A<\n"
     "0000123\n",
     kSample},
    {"od_tx1z_An",
     " 08 07 60 2a 6a 07 08 e9 07 12 02 6f 6b 00 00 00  >..`*j......ok...<\n"
     " 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00  >................<\n"
     " 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00  >................<\n"
     " 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00  >................<\n"
     " 61 62 20 63 64 20 31 32 20 33 34 20 35 36 37 38  >ab cd 12 34 5678<\n"
     " 0a ff 41                                         >..A<\n",
     kSample},
    {"od_b",
     "0000000 010 007 140 052 152 007 010 351 007 022 002 157 153 000 000 000\n"
     "0000020 000 000 000 000 000 000 000 000 000 000 000 000 000 000 000 000\n"
     "*\n"
     "0000100 141 142 040 143 144 040 061 062 040 063 064 040 065 066 067 070\n"
     "0000120 012 377 101\n"
     "0000123\n",
     kSample},
    {"od_to1_w5",
     "0000000 010 007 140 052 152\n"
     "0000005 007 010 351 007 022\n"
     "0000012 002 157 153 000 000\n"
     "0000017 000 000 000 000 000\n"
     "*\n"
     "0000074 000 000 000 000 141\n"
     "0000101 142 040 143 144 040\n"
     "0000106 061 062 040 063 064\n"
     "0000113 040 065 066 067 070\n"
     "0000120 012 377 101\n"
     "0000123\n",
     kSample},
    {"od_tx2z",
     "0000000 0708 2a60 076a e908 1207 6f02 006b 0000  >..`*j......ok...<\n"
     "0000020 0000 0000 0000 0000 0000 0000 0000 0000  >................<\n"
     "*\n"
     "0000100 6261 6320 2064 3231 3320 2034 3635 3837  >ab cd 12 34 5678<\n"
     "0000120 ff0a 0041                                >..A<\n"
     "0000123\n",
     kSample},
    {"od_tx4",
     "0000000 2a600708 e908076a 6f021207 0000006b\n"
     "0000020 00000000 00000000 00000000 00000000\n"
     "*\n"
     "0000100 63206261 32312064 20343320 38373635\n"
     "0000120 0041ff0a\n"
     "0000123\n",
     kSample},
    {"od_tx8",
     "0000000 e908076a2a600708 0000006b6f021207\n"
     "0000020 0000000000000000 0000000000000000\n"
     "*\n"
     "0000100 3231206463206261 3837363520343320\n"
     "0000120 000000000041ff0a\n"
     "0000123\n",
     kSample},
    {"xxd_i",
     "unsigned char message[] = {\n"
     "  0x08, 0x07, 0x60, 0x2a, 0x6a, 0x07, 0x08, 0xe9, 0x07, 0x12, 0x02, 0x6f,\n"
     "  0x6b\n"
     "};\n"
     "unsigned int message_len = 13;\n",
     kMessage},
    {"tcpdump_x",
     "22:13:20.000005 IP 10.0.0.1.4660 > 10.0.0.2.22136: UDP, length 29\n"
     "\t0x0000:  4500 0039 0001 0000 4011 0000 0a00 0001\n"
     "\t0x0010:  0a00 0002 1234 5678 0025 0000 0807 602a\n"
     "\t0x0020:  6a07 08e9 0712 026f 6b61 6220 6364 2031\n"
     "\t0x0030:  3220 3334 2035 3637 38\n",
     kPacket},
    {"tcpdump_X",
     "22:13:20.000005 IP (tos 0x0, ttl 64, id 1, offset 0, flags [none], proto UDP (17), length "
     "57, bad cksum 0 (->66b1)!)\n"
     "    10.0.0.1.4660 > 10.0.0.2.22136: UDP, length 29\n"
     "\t0x0000:  4500 0039 0001 0000 4011 0000 0a00 0001  E..9....@.......\n"
     "\t0x0010:  0a00 0002 1234 5678 0025 0000 0807 602a  .....4Vx.%....`*\n"
     "\t0x0020:  6a07 08e9 0712 026f 6b61 6220 6364 2031  j......okab.cd.1\n"
     "\t0x0030:  3220 3334 2035 3637 38                   2.34.5678\n",
     kPacket},
    {"tshark_x",
     "0000  00 11 22 33 44 55 66 77 88 99 aa bb 08 00 45 00   ..\"3DUfw......E.\n"
     "0010  00 39 00 01 00 00 40 11 00 00 0a 00 00 01 0a 00   .9....@.........\n"
     "0020  00 02 12 34 56 78 00 25 00 00 08 07 60 2a 6a 07   ...4Vx.%....`*j.\n"
     "0030  08 e9 07 12 02 6f 6b 61 62 20 63 64 20 31 32 20   .....okab cd 12 \n"
     "0040  33 34 20 35 36 37 38                              34 5678\n",
     std::string("00112233445566778899aabb0800") + kPacket},
    {"wireshark_hex_dump",
     "0000   08 07 60 2a 6a 07 08 e9 07 12 02 6f 6b 00 00 00\n"
     "0010   00 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00\n"
     "0020   00 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00\n"
     "0030   00 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00\n"
     "0040   61 62 20 63 64 20 31 32 20 33 34 20 35 36 37 38\n"
     "0050   0a ff 41\n",
     kSample},
    {"wireshark_hex_and_ascii_dump",
     "0000   08 07 60 2a 6a 07 08 e9 07 12 02 6f 6b 00 00 00   ..`*j......ok...\n"
     "0010   00 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00   ................\n"
     "0020   00 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00   ................\n"
     "0030   00 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00   ................\n"
     "0040   61 62 20 63 64 20 31 32 20 33 34 20 35 36 37 38   ab cd 12 34 5678\n"
     "0050   0a ff 41                                          ..A\n",
     kSample},
    {"wireshark_escaped_string",
     "\"\\x08\\x07\\x60\\x2a\\x6a\\x07\\x08\\xe9\\x07\\x12\\x02\\x6f\\x6b\\x08\\x07\\x60\" \\\n"
     "\"\\x2a\\x6a\"\n",
     "0807602a6a0708e90712026f6b0807602a6a"},
    {"wireshark_c_array",
     "/* Frame (13 bytes) */\n"
     "static const unsigned char pkt1[13] = {\n"
     "0x08, 0x07, 0x60, 0x2a, 0x6a, 0x07, 0x08, 0xe9, /* ..`*j... */\n"
     "0x07, 0x12, 0x02, 0x6f, 0x6b                    /* ...\"k */\n"
     "};\n",
     kMessage},
    {"tshark_follow",
     "00000000  61 62 20 63 64 20 31 32  20 33 34 20 35 36 37 38  ab cd 12  34 5678\n"
     "00000010  61 62 20 63 64 20 31 32                           ab cd 12 \n",
     "616220636420313220333420353637386162206364203132"},
    {"gdb_x",
     "0x555555558010 <buf>:\t0x08\t0x07\t0x60\t0x2a\t0x6a\t0x07\t0x08\t0xe9\n"
     "0x555555558018 <buf+8>:\t0x07\t0x12\t0x02\t0x6f\t0x6b\n",
     kMessage},
    {"gdb_print_x",
     "$1 = {0x8, 0x7, 0x60, 0x2a, 0x6a, 0x7, 0x8, 0xe9, 0x7, 0x12, 0x2, 0x6f, 0x6b}\n", kMessage},
    {"gdb_print", "$2 = \"\\b\\a`*j\\a\\b\\351\\a\\022\\002ok\"\n", kMessage},
    {"digits", "0807602A6a0708E90712026f6b", kMessage},
    {"digits_in_groups", "08 0760 2a6a07\t08\r\n\r\ne9 0712026f6b\n", kMessage},
    {"digits_behind_0x", "0x0807602a6a0708e90712026f6b", kMessage},
    {"digits_behind_0x_in_lines", "0x0807602a6a07\n08e90712026f6b", kMessage},
    {"digits_behind_x", "\\x0807602a6a0708e90712026f6b", kMessage},
    {"colons", "08:07:60:2a:6a:07:\n08:e9:07:12:02:6f:6b", kMessage},
    {"dashes", "08-07-60-2a-6a-07-08-e9-07-12-02-6f-6b", kMessage},
    {"commas", "08, 07,60 , 2a, 6a, 07, 08, e9, 07, 12, 02, 6f, 6b,", kMessage},
    {"numbers_0x", "0x08 0x7 0X60 0x2A 0x6a 7h 08h 0e9h 0x07 0x12 0x02 0x6f 0x6b", kMessage},
    {"c_array", "{0x08, 0x07,  // two bytes\n 0x60 /* 12 */}", "080760"},
    {"cpp_array", "constexpr std::array<uint8_t, 3> a = {{0x08, 0x07, 0x60}};", "080760"},
    {"java_array", "byte[] a = new byte[] {0x08, 0x07, 0x60};", "080760"},
    {"java_array_with_casts", "new byte[]{(byte)0x58, (byte) 0xe9}", "58e9"},
    {"rust_array_with_suffixes", "[0x58u8, 0x07u8]", "5807"},
    {"rust_slice", "&[0x58, 0x07]", "5807"},
    {"rust_vector", "let a = vec![0x58, 0x07];", "5807"},
    {"rust_array", "let a: [u8; 3] = [0x08, 0x07, 0x60];", "080760"},
    {"go_literal", "[]byte{0x08, 0x07, 0x60}", "080760"},
    {"python_list", "bytes([0x08, 0x07, 0x60])", "080760"},
    {"python_fromhex", "a = bytes.fromhex('08 07 60')", "080760"},
    {"python_bytes", "b'\\x08\\x07`*j\\x07\\x08\\xe9\\x07\\x12\\x02ok'", kMessage},
    {"python_bytearray", "bytearray(b\"\\x08\\x07'\")", "080727"},
    {"python_bytes_of_characters", "b'Hi'", "4869"},
    {"python_bytes_with_a_quote", "b\"'\"", "27"},
    {"python_hexlify", "b'0807602a6a0708e90712026f6b'", kMessage},
    {"json_of_hex", "[\"08\", \"0x07\",\n \"602A\"]", "0807602a"},
    {"strings_of_hex", "\"0807\" \\\n\"602a\"\n", "0807602a"},
    {"json_string", "\"\\b\\u0007`\\/\\\\\\n\"", "0807602f5c0a"},
    {"c_strings", "const char a[] = \"\\x08\\7`*j\" \"\\007\\b\\xe9\" \\\n \"\\a\\22\\2ok\";",
     kMessage},
    {"c_string_in_two_lines", "\"\\x08\\\n\\x07\"", "0807"},
    {"all_escapes", "'\\0\\a\\b\\t\\n\\v\\f\\r\\e\\\"\\'\\?\\377'", "000708090a0b0c0d1b22273fff"},
    {"escapes_x", "\\x08\\x07\\x60\n\\x2a", "0807602a"},
    {"escapes_octal", "\\010\\007\\140\\52", "0807602a"},
    {"brackets_of_a_debugger", "<0807602a 6a07>", "0807602a6a07"},
    {"notes", "58 07  # requestId\n60 2a  // {chatroomId}\n", "5807602a"},
    {"byte_order_mark",
     "\xef\xbb\xbf"
     "0807",
     "0807"},
    {"brackets", "{08, 07, 60}", "080760"},
    {"sql", "x'0807'", "0807"},
    {"nothing", " \n", ""},
};

class HexForm : public testing::TestWithParam<Form> {};

TEST_P(HexForm, AsItIsPrinted_IsRead) {
  EXPECT_EQ(outcome(GetParam().text), GetParam().bytes);
}

INSTANTIATE_TEST_SUITE_P(Hex, HexForm, testing::ValuesIn(kForms), name_of);

// ---- Offsets

TEST(Hex, LinesBeforeADump_AreSkipped) {
  EXPECT_EQ(outcome("$ hexdump -C a\n00000000  08 07  |..|\n00000002\n"), "0807");
  EXPECT_EQ(outcome("         00 01 02 03 04 05 06 07\n\n00000000   08 07 60   ..`\n"), "080760");
}

TEST(Hex, FirstGroupWithoutASignThatItIsAnOffset_IsBytes) {
  EXPECT_EQ(outcome("0000 0807 602a"), "00000807602a");
  EXPECT_EQ(outcome("00000000 08076029"), "0000000008076029");
  EXPECT_EQ(outcome("5807 60 2a"), "5807602a");
  EXPECT_EQ(outcome("00000010 0807602a\n00000020 0807602a"), "000000100807602a000000200807602a");
}

TEST(Hex, FirstGroupThatIsTheNextOffset_IsNone) {
  EXPECT_EQ(outcome("001000 08 07\n001002 60 2a"), "0807602a");
  EXPECT_EQ(outcome("0000020 08 07\n0000022"), "0807");
}

TEST(Hex, DumpOfOneRow_IsRead) {
  EXPECT_EQ(outcome("0000   08 07 60 2a"), "0807602a");
  EXPECT_EQ(outcome("0000000 0708 2a60"), "0807602a");
}

TEST(Hex, DumpOfAPart_IsRead) {
  EXPECT_EQ(outcome("00000010: 0807 602a  ..`*\n00000014: 6a  j\n"), "0807602a6a");
}

TEST(Hex, LastOffset_TellsHowMuchIsRepeated) {
  EXPECT_EQ(outcome("00000000  08 07\n*\n00000005\n"), "0807080708");
  EXPECT_EQ(outcome("00000000: 0807\n*\n00000006: 60\n"), "08070807080760");
  EXPECT_EQ(outcome("0000000 08 07 60 2a\n*\n0000010\n"), "0807602a0807602a");  // octal
  EXPECT_EQ(outcome("0000000 08\n*\n0000002 07\n*\n0000006 60\n0000007 60\n0000010\n"),
            "0808070707076060");  // octal, as only the last one tells
  EXPECT_EQ(outcome("0000000 08 07 60 2a\n*\n0000008\n"), "0807602a0807602a");  // decimal
}

// 64 MiB and one byte.
TEST(Hex, RowsRepeatedBeyondAllMeasure_AreRefused) {
  EXPECT_THROW(from_hex("00000000: 08\n*\n04000001:\n"), qel_wire::Misread);
}

// ---- Characters beside the bytes

TEST(Hex, CharactersThatLookLikeHex_AreNoBytes) {
  for (const char* text : {
           "00000000: 6162 2063 6420 3132  ab cd 12\n",
           "00000000: 61 62 20 63 64 20 31 32  ab cd 12\n",
           "00000000  61 62 20 63 64 20 31 32                           |ab cd 12|\n00000008\n",
           "0000000 61 62 20 63 64 20 31 32  >ab cd 12<\n0000010\n",
           " 61 62 20 63 64 20 31 32  >ab cd 12<\n",
           " 61 62 20 63 64 20 31 32  >{\"=07 <\n",
           "0000   61 62 20 63 64 20 31 32                           ab cd 12\n",
       }) {
    EXPECT_EQ(outcome(text), "6162206364203132") << text;
  }
}

TEST(Hex, CharactersThatHideSome_AreIgnored) {
  EXPECT_EQ(outcome("0x4010: 0x61 0x62  **\n"), "6162");
  EXPECT_EQ(outcome("00000000: 7365 6372 6574  ******\n"), "736563726574");
}

TEST(Hex, OrderThatARowShows_HoldsForAll) {
  EXPECT_EQ(
      outcome("00000000: 01070807  ....\n00000004: 61070807  a...\n00000008: 01070807  ....\n"),
      "010708076107080701070807");
}

TEST(Hex, BytesBehindAWiderGap_AreRefused) {
  EXPECT_EQ(outcome("00000000: 0807  602a\n"),
            "1:17: neither bytes nor the characters of those before");
  EXPECT_EQ(outcome("0000   08 07  60 2a\n"),
            "1:15: neither bytes nor the characters of those before");
}

// As "xxd -e" prints them, and "od --endian=big".
TEST(Hex, CharactersInAnotherOrder_AreRefused) {
  constexpr char kReason[] = "characters that show another order of the bytes in a group";
  EXPECT_EQ(outcome("00000000: 2a600708  ..`*\n"), std::string("1:21: ") + kReason);
  EXPECT_EQ(outcome("0000000 0807 602a  >..`*<\n0000004\n"), std::string("1:20: ") + kReason);
}

// ---- What is refused

class HexMistake : public testing::TestWithParam<Form> {};

TEST_P(HexMistake, Found_IsNamedWithItsPlace) {
  EXPECT_EQ(outcome(GetParam().text), GetParam().bytes);
}

constexpr char kStray[] = "no hex digit, and nothing that may stand between bytes";
constexpr char kOdd[] = "an odd number of hex digits: a byte has two";
constexpr char kDecimal[] = "a list of decimal numbers: write them in hex, with 0x";
constexpr char kOrder[] = "the order of the bytes in these groups is not clear: print single bytes";
constexpr char kMissing[] = "the last line is missing, whose offset tells how many bytes are above";
constexpr char kNoBytes[] = "no bytes in hex or octal: use od -tx1 or hexdump -C";

const std::vector<Form> kMistakes = {
    {"words_of_od_without_offsets", " 0758 2a60\n", std::string("1:1: ") + kOrder},
    {"groups_of_four_that_no_character_orders", "00000000: 01070807  ....\n",
     std::string("1:11: ") + kOrder},
    {"group_to_the_right_as_xxd_e_has_the_last_one", "00000000:     6107  .a\n",
     std::string("1:15: ") + kOrder},
    {"decimal_numbers_without_brackets", "88, 16, 96", std::string("1:1: ") + kDecimal},
    {"digit_too_few", "08 07\n60 2\n", std::string("2:4: ") + kOdd},
    {"digit_too_few_in_a_long_line", "0807602a6a0\n", std::string("1:1: ") + kOdd},
    {"digit_too_few_in_quotes", "[\"08\", \"7\"]", std::string("1:9: ") + kOdd},
    {"digit_too_few_in_a_dump", "00000000: 0807 602a\n00000004: 6a0 \n",
     std::string("2:11: ") + kOdd},
    {"letter", "08 07\n 60 g2\n", std::string("2:5: ") + kStray},
    {"letter_in_a_dump", "0000   08 07\n0002   60 zz\n", std::string("2:11: ") + kStray},
    {"ellipsis", "08:07:60\xe2\x80\xa6", std::string("1:9: ") + kStray},
    {"no_offset", "00000000: 0807\nnone: 602a\n",
     "2:1: no offset before the bytes, as in the lines above"},
    {"od_c_beside_tx1",
     "0000000  08  07\n"
     "         \\b  \\a\n"
     "0000002\n",
     "1:10: no bytes in hex or octal: use od -tx1 or hexdump -C"},
    {"line_lost", "00000000: 0807\n00000004: 602a\n",
     "2:1: an offset that does not follow from the 2 bytes above"},
    {"line_twice", "0000   08 07\n0002   60 2a\n0002   60 2a\n",
     "3:1: an offset that does not follow from the 4 bytes above"},
    {"end_lost", "00000000  08 07 60 2a  |..`*|\n00000005\n",
     "2:1: an offset that does not follow from the 4 bytes above"},
    {"second_packet", "\t0x0000:  0807 602a\n12:00 IP\n\t0x0000:  0807\n",
     "2:1: another dump begins: only one is read"},
    {"second_dump", "00000000: 0807\n\n00000000: 0807\n",
     "3:1: another dump begins: only one is read"},
    {"one_row_of_a_part", "0010   08 07\n",
     "1:1: an offset, or bytes? a colon behind it, or single blanks would tell"},
    {"repeated_without_end", "00000000  08 07\n*\n", std::string("3:1: ") + kMissing},
    {"odd_size_without_end", "0000000 0708 0060\n", std::string("2:1: ") + kMissing},
    {"repeated_without_offsets", " 08 07\n*\n 60\n",
     "2:1: without offsets, it is not clear how much * stands for: use od -v"},
    {"first_row_repeated", "0000000 0000 0000\n*\n0000040\n",
     "3:1: offsets that may be hex, octal or decimal: use the option -v"},
    {"groups_without_order", "0000 0807 602a\n0004 6a07\n", std::string("1:6: ") + kOrder},
    {"gdb_words", "0x4010 <a>:\t0x2a600708\n", std::string("1:15: ") + kOrder},
    {"array_of_words", "{0x0807, 0x602a}", std::string("1:2: ") + kOrder},
    {"xxd_b", "00000000: 00001000 00000111  ..\n",
     "1:30: neither bytes nor the characters of those before"},
    {"od_c", "0000000  \\b  \\a   `   *\n0000004\n", std::string("1:10: ") + kNoBytes},
    {"od_a", "0000000  bs bel   `   *\n0000004\n", std::string("1:10: ") + kNoBytes},
    {"od_td1", "0000000    8    7   96   42\n0000004\n", std::string("1:12: ") + kNoBytes},
    {"hexdump_o_of_a_repeated_row", "0000000  003410  003410\n*\n0000010\n",
     "3:1: offsets that may be hex, octal or decimal: use the option -v"},
    {"hex_before_a_dump", "08 07\n00000000: 602a\n", std::string("2:9: ") + kStray},
    {"od_tu1", "0000000  50  60\n0000002\n", std::string("1:10: ") + kNoBytes},
    {"hexdump_d", "0000000   01800   10848\n0000004\n", std::string("1:11: ") + kNoBytes},
    {"octal_beyond_a_byte", "0000000 400 007\n0000002\n",
     "1:9: no number of 1 byte like the first one"},
    {"number_of_another_size", "0000000 0708 2a6\n0000004\n",
     "1:14: no number of 2 bytes like the first one"},
    {"python_list", "[8, 7, 96, 42]", std::string("1:2: ") + kDecimal},
    {"java_list", "{10, 107, 7}", std::string("1:6: ") + kDecimal},
    {"list_without_brackets", "80, 96, 7", std::string("1:9: ") + kDecimal},
    {"list_that_begins_with_one_digit", "8, 7", std::string("1:1: ") + kDecimal},
    {"list_of_one", "[8]", std::string("1:2: ") + kDecimal},
    {"list_of_two_digits_each", "[10, 20, 30]", std::string("1:2: ") + kDecimal},
    {"decimal_among_hex", "{0x08, 10}", "1:8: no 0x before this number, as before others"},
    {"offset_before_numbers", "0010 0x08 0x07", "1:1: no 0x before this number, as before others"},
    {"length_that_is_not_true", "unsigned char a[] = {\n  0x08\n};\nunsigned int a_len = 2;\n",
     "4:22: not the array's length: it has 1 byte"},
    {"letters_behind_digits", "08 07\n60 2g\n", std::string("2:5: ") + kStray},
    {"no_digits_in_a_dump", "00000000: 0x\n*\n00000002\n", std::string("1:13: ") + kStray},
    {"second_array", "char a[] = {0x08};\nuint8_t b[] = {0x07};", std::string("2:1: ") + kStray},
    {"comment_without_end", "{0x08, /* 0x07}", "1:8: a comment without an end"},
    {"quote_without_end", "\"\\x08\n\\x07\"", "1:1: a quote that is not closed in its line"},
    {"escape_unknown", "\"\\x08\\q\"", "1:6: an escape that is no byte"},
    {"escape_beyond_a_byte", "\"\\x08\\400\"", "1:6: an escape that is no byte"},
    {"escape_of_a_character", "\"\\u00e9\"", "1:2: an escape that is no byte"},
    {"escape_of_a_blank", "\"\\x08\\ 07\"", "1:6: an escape that is no byte"},
    {"escape_without_digits", "\"\\xg\"", "1:2: an escape that is no byte"},
    {"hex_without_quotes", "\\x08\\x07ab", std::string("1:5: ") + kOrder},
    {"characters_without_quotes", "\\x08\\x07`*j", std::string("1:9: ") + kStray},
    {"quotes_without_escape", "\"Hi\"", std::string("1:2: ") + kStray},
};

INSTANTIATE_TEST_SUITE_P(Hex, HexMistake, testing::ValuesIn(kMistakes), name_of);

}  // namespace
