// Base64 and hexadecimal text and their output blocks; splitting, joining and
// appending strings; memory primitives; formatted allocation; wide conversion.
#include <malloc.h>

#include <clocale>
#include <numeric>
#include <random>

#include "support/zvt.h"

namespace {

constexpr auto kNull = ZV_ERR_NULL_ARG, kMem = ZV_ERR_NO_MEMORY, kBad = ZV_ERR_BAD_VALUE;
using zvt::kUntouched, zvt::Text;

// |block| holds |bytes|. At sizes where the allocator leaves no slack this
// shows a block one byte short without the sanitizer too.
#define EXPECT_HOLDS(block, bytes) EXPECT_GE(malloc_usable_size(block), size_t{bytes})
// A row's call that must leave what it would store through &o (of |Type|) as it was.
#define UNTOUCHED(Type, ...) \
    [&] { Type o = (Type)8; zv_status s = __VA_ARGS__; EXPECT_EQ(o, (Type)8); return s; }

constexpr char kAlphabet[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";

// |code| run on a copy of |in| that 64 alphabet characters precede and |pad|
// follow, which change the output of a read outside |in|; without those after
// it, a read past the end shows under the sanitizer. Returns the output, after
// checking that the output block holds it.
template <class Out, class Code>
std::string coded(Code code, const std::string &in, size_t pad)
{
    std::string block = std::string(64, 'A') + in + std::string(pad, 'A');
    Out *out = nullptr;
    uint32_t n = 0;
    EXPECT_EQ(code(block.data() + 64, static_cast<uint32_t>(in.size()), &out, &n), ZV_OK);
    std::string result(reinterpret_cast<char *>(out), n);
    EXPECT_HOLDS(out, n);
    std::free(out);
    return result;
}

std::string encode(Text s, size_t pad = 0) { return coded<char>(zv_util_base64_encode, s, pad); }
std::string decode(Text s, size_t pad = 0) { return coded<uint8_t>(zv_util_base64_decode, s, pad); }
zv_status print_hex(const char *bytes, uint32_t n, char **out, uint32_t *length)
{
    *length = 2 * n + 1;  // the NUL too
    return zv_util_sprintf_bytes(bytes, n, out);
}
std::string hex(Text s, size_t pad = 0) { return coded<char>(print_hex, s, pad); }

// Every processor path codes inputs of every length up to 140 and a few longer
// ones, every other one padded, as the scalar path does; |pick(n)| draws the
// characters of the input of length n.
void expect_paths_agree(std::string (*code)(Text, size_t), const std::function<char(size_t)> &pick)
{
    std::vector<std::string> ins, scalar;
    for (size_t n = 0; n < 1100; n += n < 140 ? 1 : 239)
        for (ins.emplace_back(); ins.back().size() < n;)
            ins.back() += pick(n);
    zv::cpu::restrict(0);
    for (size_t k = 0; k < ins.size(); k++)
        scalar.push_back(code(ins[k], k % 2 * 64));
    zvt::for_each_feature_path([&](uint32_t features) {
        for (size_t k = 0; k < ins.size(); k++)
            ASSERT_EQ(code(ins[k], k % 2 * 64), scalar[k]) << "features " << features << " @" << k;
    });
}

TEST(Base64, KnownAnswersSkippedCharactersAndEveryPathAsScalar)
{
    // The 48 bytes whose text is the alphabet in order; every path must encode them back to it.
    const std::string kAlphabetBytes = decode(kAlphabet);
    const std::string rows[][2] = {{"", ""}, {"f", "Zg=="}, {"fo", "Zm8="}, {"foo", "Zm9v"},
        {"foob", "Zm9vYg=="}, {"fooba", "Zm9vYmE="}, {"foobar", "Zm9vYmFy"}, {"\xfb\xff", "+/8="},
        {kAlphabetBytes, kAlphabet}};
    std::string junk, salted;
    for (unsigned c = 0; c < 256; c++)
        if (!std::memchr(kAlphabet, static_cast<int>(c), 64))
            junk += static_cast<char>(c);  // '=' and NUL among them
    // 0, 2, 4 or 6 junk characters after each alphabet character use up the junk.
    for (size_t i = 0, used = 0; i < 64; used += 2 * (i % 4), i++)
        salted += kAlphabet[i] + junk.substr(used, 2 * (i % 4));
    zvt::for_each_feature_path([&](uint32_t features) {
        SCOPED_TRACE(features);
        for (const auto &[bytes, text] : rows)  // padded and unpadded text decode alike
            EXPECT_EQ(std::make_tuple(encode(bytes), decode(text),
                                      decode(text.substr(0, text.find('=')))),
                      std::make_tuple(text, bytes, bytes));
        // A lone final value carries no byte.
        EXPECT_EQ(decode(salted + junk + kAlphabet + "Y", 64), kAlphabetBytes + kAlphabetBytes);
        for (char c : junk)  // a 64-character block and then its halves hold it
            for (size_t at : {0, 15, 16, 31, 47, 64})
                ASSERT_EQ(decode((kAlphabet + std::string(kAlphabet)).insert(at, 1, c)),
                          kAlphabetBytes + kAlphabetBytes) << int(c) << "@" << at;
    });
    EXPECT_EQ(zv_util_to_base64_size(3221225469u), 4294967292u);
    EXPECT_EQ(zv_util_to_base64_size(3221225470u), 0u);
    std::mt19937 random(1);
    expect_paths_agree(encode, [&](size_t) { return static_cast<char>(random()); });
    // Alphabet text with '=', line breaks or another byte at a density set by the length.
    unsigned percent[] = {0, 2, 10, 50};
    expect_paths_agree(decode, [&](size_t n) {
        bool other = random() % 100 < percent[n % 4];
        return other ? "=\n\r\xc1"[random() % 4] : kAlphabet[random() % 64];
    });

    // The coder records no frame and logs nothing. Text beyond 32 bits is
    // refused; the longest that fits is allocated.
    uint32_t n = 7;
    zvt::expect_failures({
        {"", kMem, UNTOUCHED(char *, zv_util_base64_encode("", 3221225470u, &o, &n))},
        {"", kMem, ZVT_NULLS(char *, zv_util_base64_encode("", 3221225469u, &o, &n)), "alloc_huge"},
    });
    EXPECT_EQ(n, 7u);
    zvt::sweep_allocations(ZVT_NULLS(char *, zv_util_base64_encode("foo", 3, &o, &n)), {{""}});
    zvt::sweep_allocations(ZVT_NULLS(uint8_t *, zv_util_base64_decode("Zg", 2, &o, &n)), {{""}});
}

TEST(Hex, KnownAnswersEveryPathAsScalarAndFailures)
{
    // Lower-case pairs, read back in either case; an odd last digit is ignored.
    std::string every_byte(256, '\0');
    std::iota(every_byte.begin(), every_byte.end(), '\0');
    uint8_t *bytes = nullptr;
    std::string text = hex(every_byte).substr(0, 512) + "0123456789ABCDEFz";
    EXPECT_EQ(text.find_first_not_of("0123456789abcdef"), 522u);
    ASSERT_EQ(zv_util_sscanf_bytes(text.data(), text.size(), &bytes), ZV_OK);
    EXPECT_EQ(std::string(reinterpret_cast<char *>(bytes), 264),
              every_byte + "\x01\x23\x45\x67\x89\xab\xcd\xef");
    std::free(bytes);
    std::mt19937 random(2);
    expect_paths_agree(hex, [&](size_t) { return static_cast<char>(random()); });
    char printed[1200] = {};
    FILE *stream = fmemopen(printed, sizeof printed, "w");
    EXPECT_EQ(zv_util_fprintf_bytes(stream, text.data(), text.size()), ZV_OK);  // in several chunks
    std::fclose(stream);
    EXPECT_EQ(printed + std::string(1, '\0'), hex(text));

    const char *scan = "zv_util_sscanf_bytes", *print = "zv_util_sprintf_bytes",
               *log = "Allocation failed";
    zvt::expect_failures({
        {scan, kBad, ZVT_NULLS(uint8_t *, zv_util_sscanf_bytes("g0", 2, &o))},
        {scan, kBad, ZVT_NULLS(uint8_t *, zv_util_sscanf_bytes("0:", 2, &o))},
        // From 2^31 bytes on the text would not fit 32 bits.
        {print, kMem, ZVT_NULLS(char *, zv_util_sprintf_bytes("", 1u << 31, &o)), nullptr, 1,
         kUntouched, log},
        {"zv_util_fprintf_bytes", kNull, ZVT_CALL(zv_util_fprintf_bytes(stdout, nullptr, 0))},
        {"zv_util_printf_bytes", kNull, ZVT_CALL(zv_util_printf_bytes(nullptr, 1))},
    });
    zvt::sweep_allocations(ZVT_NULLS(uint8_t *, zv_util_sscanf_bytes("01", 2, &o)), {{scan, log}});
    zvt::sweep_allocations(ZVT_NULLS(char *, zv_util_sprintf_bytes("", 1, &o)), {{print, log}});
}

TEST(Strings, SplitJoinAppendAndFailures)
{
    auto split = [](const char *text, const char *separator) {
        char **fields = nullptr;
        uint32_t count = 99;
        EXPECT_EQ(zv_util_split(text, separator, &fields, &count), ZV_OK);
        std::string all = count == 0 && fields == nullptr ? "" : "|";
        for (uint32_t i = 0; i < count; all += std::string(fields[i]) + "|", std::free(fields[i++]))
            EXPECT_HOLDS(fields[i], std::strlen(fields[i]) + 1);
        std::free(fields);
        return all;
    };
    // Runs and ends add nothing; only the whole separator matches, not a shorter last piece;
    // no field gives no array.
    EXPECT_EQ(split(",a,,b,", ",") + split("one--two", "--") + split("a-b", "--") +
              split("xaaa", "aa") + split(",,,", ",") + split("", ","), "|a|b||one|two||a-b||x|a|");
    auto join = [](std::vector<const char *> strings, const char *separator, uint32_t count) {
        char *out = nullptr;
        uint32_t size = 0;
        EXPECT_EQ(zv_util_join(strings.data(), count, separator, &out, &size), ZV_OK);
        std::string joined(out);
        EXPECT_EQ(size, joined.size() + 1);
        EXPECT_HOLDS(out, size);
        std::free(out);
        return joined;
    };
    // Count 0 reads no string.
    EXPECT_EQ(join({"a", "b"}, "", 2) + join({nullptr}, ",", 0) + join({"a", "", "b"}, ", ", 3),
              "aba, , b");

    std::string expected;
    expected.reserve(128);
    size_t heap = zvt::heap_in_use();
    char *string = nullptr;
    uint32_t length = 42;  // ignored while the string is NULL
    for (uint32_t n = 1; expected.size() < 100; n = n % 3 + 1) {  // through every block size
        expected.append("a\0b", n);  // a NUL within n is copied like any byte
        ASSERT_EQ(zv_util_append_string(&string, &length, "a\0b", n), ZV_OK);
        ASSERT_EQ(std::make_tuple(length, std::string(string, expected.size() + 1)),
                  std::make_tuple(uint32_t(expected.size()), expected + '\0'));
        EXPECT_HOLDS(string, length + 1);
    }
    std::free(string);
    EXPECT_EQ(zvt::heap_in_use(), heap);

    // Refused calls write nothing to these but |refused|, which a refused join
    // sets to 0; |out| also stands for a string the calls never read.
    char *out = reinterpret_cast<char *>(8), **fields = reinterpret_cast<char **>(8);
    uint32_t n = 7, lengths[] = {0, UINT32_MAX - 2, UINT32_MAX - 3}, size, count = 7, refused = 7;
    const char *strings[] = {"a", "b"}, *log = "Allocation failed";
    std::string sep(65538, '-');
    // 65535 separators of 65537 characters make 2^32 - 1; so do as many strings of 65537
    // characters and no separator, which leaves no room for the NUL; one string more makes
    // too many characters.
    std::vector<const char *> empties(65535, ""), pieces(65536, sep.c_str() + 1);
    // A NULL between checked pointers fails either || turned into &&.
    auto logged = [line = std::string(128, '\0')](auto... p) mutable {
        line.resize(std::snprintf(line.data(), 128, "NULL argument detected: %p %p %p %p",
                                  static_cast<const void *>(p)...));
        return line;
    };
    zvt::expect_failures({
        ROW(kNull, split, (log, nullptr, &fields, &n), .log = logged(log, nullptr, &fields, &n)),
        ROW(kNull, split, (log, log, nullptr, &n), .log = logged(log, log, nullptr, &n)),
        ROW(kNull, split, (log, log, &fields, nullptr), .log = logged(log, log, &fields, nullptr)),
        ROW(kBad, split, ("a", "", &fields, &n)),
        ROW(kNull, join, (strings, 1, nullptr, &out, &size)),
        ROW(ZV_ERR_OVERFLOW, join, (empties.data(), 65535, sep.c_str(), &out, &refused)),
        // The size just fits; allocating it fails.
        {"zv_util_join", kMem,
         ZVT_NULLS(char *, zv_util_join(empties.data(), 65535, sep.c_str() + 1, &o, &size)),
         "alloc_huge"},
        ROW(kNull, append_string, (&out, nullptr, "xy", 1)),
        ROW(kBad, append_string, (&out, &n, "xy", 0)),
        ROW(kBad, append_string, (&out, &lengths[0], "xy", 1)),
        // The new length and its NUL: one past 32 bits, then just fitting.
        ROW(ZV_ERR_OVERFLOW, append_string, (&out, &lengths[1], "xy", 2)),
        ROW(kMem, append_string, (&out, &lengths[2], "xy", 2), .point = "alloc_huge"),
    });
    // Reading 4 GiB is too slow under emulation.
    if (sizeof(void *) == 8)
        zvt::expect_failures({ROW(ZV_ERR_OVERFLOW, join, (pieces.data(), 65535, "", &out, &size)),
                              ROW(ZV_ERR_OVERFLOW, join, (pieces.data(), 65536, "", &out, &size))});
    EXPECT_EQ(std::make_tuple((void *)out, (void *)fields, n, lengths[2], refused),
              std::make_tuple((void *)8, (void *)8, 7u, UINT32_MAX - 3, 0u));

    // The array comes first, then one block per field.
    const zvt::Step field{"zv_util_split", "Failed to allocate memory"};
    zvt::sweep_allocations(ZVT_NULLS(char **, zv_util_split("one,two,three", ",", &o, &count)
                                                  ?: (std::for_each(o, o + count, std::free), 0)),
                           {{"zv_util_split", "Memory allocation failed"}, field, field, field});
    zvt::sweep_allocations(ZVT_NULLS(char *, zv_util_join(strings, 2, ",", &o, &size)),
                           {{"zv_util_join"}});
    // The string stays NULL until the call succeeds.
    zvt::sweep_allocations(ZVT_NULLS(char *, zv_util_append_string(&(o = nullptr), &n, "xy", 2)),
                           {{"zv_util_append_string"}});
}

TEST(Memory, Primitives)
{
    size_t heap = zvt::heap_in_use();
    char *block = static_cast<char *>(std::malloc(16));
    zv_util_free(&block);
    zv_util_free(nullptr);
    EXPECT_EQ(std::make_tuple(block, zvt::heap_in_use()), std::make_tuple(nullptr, heap));
    std::string source;
    // Through every block size.
    for (uint32_t size = 0; size < 48; source += static_cast<char>('A' + size++)) {
        auto *copy = static_cast<char *>(zv_util_memdup(source.data(), size));
        auto *text = static_cast<char *>(zv_util_memdup0(source.data(), size));
        EXPECT_EQ(std::make_tuple(std::string(copy, size), std::string(text, size + 1)),
                  std::make_tuple(source, source + '\0'));
        EXPECT_HOLDS(copy, size);
        EXPECT_HOLDS(text, size + 1);
        std::free(copy);
        std::free(text);
    }
    // Refused: a size that does not fit with its NUL, no source. No frames.
    zvt::expect_failures({{"", kMem, ZVT_BLOCK(zv_util_memdup0("x", UINT32_MAX))},
                          {"", kMem, ZVT_BLOCK(zv_util_memdup(nullptr, 3))},
                          {"", kMem, ZVT_BLOCK(zv_util_memdup0(nullptr, 3))}});
    zvt::sweep_allocations(ZVT_BLOCK(zv_util_memdup("abc", 3)), {{""}});
    zvt::sweep_allocations(ZVT_BLOCK(zv_util_memdup0("abc", 3)), {{""}});
    zvt::sweep_allocations(ZVT_BLOCK(zv_util_strndup("abc", 2)), {{""}});

    const std::tuple<int32_t, const char *, int32_t, const char *> rows[] = {
        {8, "1234567", 7, "1234567"}, {8, "12345678", -1, "1234567"}, {0, "a", -1, "-"},
        {-1, "a", -1, "-"}};
    for (const auto &[size, text, result, after] : rows) {
        char buffer[16] = "-";
        int32_t written = zv_util_snprintf(buffer, size, "%s", text);
        EXPECT_EQ(std::make_tuple(written, std::string(buffer)), std::make_tuple(result, after));
    }
    // The walk stops at the maximum or at the first NUL of the original text.
    const std::tuple<uint32_t, char, const char *> replaced[] = {
        {3, '.', "a\0n.n."}, {100, '.', "a\0n\0n\0"}, {0, '.', "a.n.n."}, {100, '\0', "a.n.n."},
        {100, 'a', "\0.n.n."}};
    for (const auto &[maximum, find, after] : replaced) {
        char text[] = "a.n.n.\0z";
        EXPECT_EQ(zv_util_str_replace(text, maximum, find, find ? '\0' : 'b'), ZV_OK);
        EXPECT_EQ(std::string(text, 8), std::string(after, 7) + 'z') << maximum;
    }
    EXPECT_EQ(zv_util_str_replace(nullptr, 5, 'a', 'b'), ZV_OK);
}

zv_status vsize(uint32_t *size, const char *format, ...)
{
    va_list args;
    va_start(args, format);
    zv_status status = zv_util_printf_vsize(format, args, size);
    va_end(args);
    return status;
}

TEST(Format, AllocatesExactlyTheMeasuredSize)
{
    std::string big(5000, 'q'), expected = "x=42 " + big + "%";
    char *text = nullptr;
    int32_t err = -1;
    uint32_t size = 0, empty = 0;
    EXPECT_OK(vsize(&empty, ""), vsize(&size, "x=%d %s%%", 42, big.c_str()));
    ASSERT_EQ(zv_util_asprintf(&text, &err, "x=%d %s%%", 42, big.c_str()), ZV_OK);
    EXPECT_EQ(std::make_tuple(std::string(text), err, size, empty),
              std::make_tuple(expected, 0, expected.size() + 1, 1u));
    EXPECT_HOLDS(text, size);
    std::free(text);

    const char *no_format = nullptr, *vas = "zv_util_vasprintf";
    auto format = ZVT_NULLS(char *, zv_util_asprintf(&o, &zvt::row_errno, "%s/%d", "path", 12));
    zvt::expect_failures({
        {vas, kNull, UNTOUCHED(char *, zv_util_asprintf(&o, &zvt::row_errno, no_format, 0))},
        {"zv_util_printf_vsize", kNull, ZVT_CALL(vsize(nullptr, "x"))},
        {"zv_util_printf_vsize,zv_util_vasprintf", ZV_ERR_SYSTEM, format, "vsnprintf"},
        {vas, ZV_ERR_SYSTEM, format, "vsnprintf", 2, EIO},
    });
    zvt::sweep_allocations(format, {{vas}}, 0);
}

TEST(Wide, ConvertsInTheLocaleIntoAnExactBlock)
{
    std::string saved = std::setlocale(LC_CTYPE, nullptr), multibyte;
    ASSERT_NE(std::setlocale(LC_CTYPE, "C.UTF-8"), nullptr);
    const char *pieces[] = {"a", "\xc3\xa9", "\xe2\x82\xac", "\xf0\x9f\x98\x80"};
    const wchar_t wides[] = L"a\u00e9\u20ac\U0001F600";
    // The text and its NUL (a vector: valgrind takes glibc's vector wmemcmp for an overread).
    std::vector<wchar_t> wide{L'\0'};
    // Through every block size.
    for (uint32_t i = 0, count; i < 16; i++) {
        wchar_t *out = nullptr;
        ASSERT_EQ(zv_util_char_to_wchar(multibyte.c_str(), 12345, &out, &count), ZV_OK);
        EXPECT_EQ(std::vector<wchar_t>(out, out + count + 1), wide);
        EXPECT_HOLDS(out, (count + 1) * sizeof(wchar_t));
        std::free(out);
        multibyte += pieces[i % 4], wide.insert(wide.end() - 1, wides[i % 4]);
    }
    std::setlocale(LC_CTYPE, saved.c_str());

    uint32_t count = 7;
    const char *wchar = "zv_util_char_to_wchar";
    auto convert = ZVT_NULLS(wchar_t *, zv_util_char_to_wchar("abc", 0, &o, &count));
    zvt::expect_failures({
        {wchar, kNull, ZVT_CALL(zv_util_char_to_wchar("a", 0, nullptr, &count))},
        // Refused before allocating.
        {wchar, kBad, UNTOUCHED(wchar_t *, zv_util_char_to_wchar("a\x80", 0, &o, &count))},
        // Converting fails, or stops short of the end.
        {wchar, kBad, convert, "mbsrtowcs", 2},
        {wchar, ZV_ERR_TOO_SMALL, convert, "mbsrtowcs_short"},
    });
    zvt::sweep_allocations(convert, {{wchar}});
}

}  // namespace
