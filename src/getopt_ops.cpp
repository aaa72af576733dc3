// Option table parser and its string, integer and flag handlers.
#include <zvutil/getopt.h>

#include <zvutil/memory.h>

#include <cerrno>
#include <cstring>

#include "internal.h"

namespace {

constexpr uint32_t kMaxValueLength = 300;

// The record to apply for |arg|, or nullptr when |arg| is not an option or
// no record names it. "-x" and "/x" name short options; longer arguments name
// a long option after "-", "--" or "/", never a run of short ones.
const zv_util_option *find_record(const char *arg, const zv_util_option *table, int32_t count)
{
    if (arg == nullptr)
        return nullptr;
    const size_t length = strnlen(arg, 3);
    if (length <= 1 || (arg[0] != '-' && arg[0] != '/'))
        return nullptr;
    if (length == 2) {
        for (int32_t k = 0; k < count; ++k)
            if (table[k].short_name == arg[1])
                return &table[k];
        return nullptr;
    }
    const char *name = arg[1] == '-' ? arg + 2 : arg + 1;
    for (int32_t k = 0; k < count; ++k) {
        const char *long_name = table[k].long_name;
        // A name that fills the array without a terminator matches nothing.
        if (strnlen(long_name, sizeof table[k].long_name) < sizeof table[k].long_name &&
            std::strcmp(long_name, name) == 0)
            return &table[k];
    }
    return nullptr;
}

// Applies |record| to argv[*index] and advances *index past the option and
// its value.
zv_status process_option(const zv_util_option *record, char *const argv[], int32_t argc,
                         int32_t *index)
{
    const char *value = nullptr;
    int32_t step = 1;
    if (record->takes_value != 0) {
        if (*index + 1 >= argc)
            return ZV_LOG_FAIL(ZV_ERR_SYSTEM, "Missing mandatory option\n");
        value = argv[*index + 1];
        step = 2;
    }
    if (record->handler == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    uint32_t consumed = 0;
    if (zv_status status = record->handler(record, value, &consumed); status != ZV_OK)
        return ZV_FAIL(status);
    // The step is fixed by the record, whatever the handler says it consumed.
    *index += step;
    return ZV_OK;
}

// The checks every handler opens with: ZV_ERR_NULL_ARG for a missing record,
// destination or |consumed|, or a missing |value| where one is wanted;
// ZV_ERR_BAD_VALUE for a value longer than kMaxValueLength. Records no frame.
zv_status check_handler_args(const zv_util_option *record, const char *value,
                             const uint32_t *consumed, bool wants_value)
{
    if (record == nullptr || (wants_value && value == nullptr) || consumed == nullptr ||
        record->destination == nullptr)
        return ZV_ERR_NULL_ARG;
    if (wants_value && zv_util_strnlen(value, kMaxValueLength + 1) > kMaxValueLength)
        return ZV_ERR_BAD_VALUE;
    return ZV_OK;
}

}  // namespace

extern "C" {

ZV_EXPORT zv_status zv_util_getopt(int32_t argc, char *const argv[], const zv_util_option *table,
                                   int32_t count)
{
    if (argv == nullptr || table == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    if (argc < 1 || count < 1)
        return ZV_FAIL(ZV_ERR_BAD_VALUE);
    return zv_util_getopt_from(argc, argv, table, count, 1);
}

ZV_EXPORT zv_status zv_util_getopt_from(int32_t argc, char *const argv[],
                                        const zv_util_option *table, int32_t count,
                                        int32_t start)
{
    if (argv == nullptr || table == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    if (argc < 1 || count < 1 || start < 0)
        return ZV_FAIL(ZV_ERR_BAD_VALUE);

    int32_t i = start;
    while (i < argc) {
        const zv_util_option *record = find_record(argv[i], table, count);
        if (record == nullptr) {
            ++i;
            continue;
        }
        if (zv_status status = process_option(record, argv, argc, &i); status != ZV_OK)
            return ZV_FAIL_TWICE(status);
    }
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_getopt_string(const zv_util_option *record, const char *value,
                                          uint32_t *consumed)
{
    if (zv_status status = check_handler_args(record, value, consumed, true); status != ZV_OK)
        return ZV_FAIL(status);
    auto *destination = static_cast<char **>(record->destination);
    if (*destination != nullptr)
        return ZV_FAIL(ZV_ERR_BAD_VALUE);
    char *copy = zv::copy_text(value, std::strlen(value));
    if (copy == nullptr)
        return ZV_FAIL(ZV_ERR_NO_MEMORY);
    *destination = copy;
    *consumed = 2;
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_getopt_int(const zv_util_option *record, const char *value,
                                       uint32_t *consumed)
{
    if (zv_status status = check_handler_args(record, value, consumed, true); status != ZV_OK)
        return ZV_FAIL(status);
    // Accepts what "%d" accepts (leading space, a sign, anything after the
    // digits), but a number out of range is refused rather than wrapped.
    char *end = nullptr;
    const int saved_errno = errno;
    errno = 0;
    const long long number = std::strtoll(value, &end, 10);
    const bool out_of_range = errno == ERANGE || number < INT32_MIN || number > INT32_MAX;
    errno = saved_errno;
    if (end == value || out_of_range)
        return ZV_FAIL(ZV_ERR_BAD_VALUE);
    *static_cast<int32_t *>(record->destination) = static_cast<int32_t>(number);
    *consumed = 2;
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_getopt_flag(const zv_util_option *record, const char *value,
                                        uint32_t *consumed)
{
    if (zv_status status = check_handler_args(record, value, consumed, false); status != ZV_OK)
        return ZV_FAIL(status);
    if (record->takes_value != 0)
        return ZV_FAIL(ZV_ERR_BAD_VALUE);
    *static_cast<int32_t *>(record->destination) = 1;
    *consumed = 1;
    return ZV_OK;
}

}  // extern "C"
