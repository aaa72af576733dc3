// Allocation functions, one fault point "alloc" for all of them.
#include <cstddef>
#include <cstdlib>
#include <cstring>

#include "support/fault.h"

extern "C" {

void *__real_malloc(size_t size);
void *__real_calloc(size_t count, size_t size);
void *__real_realloc(void *block, size_t size);
char *__real_strdup(const char *string);
char *__real_strndup(const char *string, size_t maximum);

void *__wrap_malloc(size_t size)
{
    return zvt::fault_hit("alloc") ? nullptr : __real_malloc(size);
}

void *__wrap_calloc(size_t count, size_t size)
{
    return zvt::fault_hit("alloc") ? nullptr : __real_calloc(count, size);
}

void *__wrap_realloc(void *block, size_t size)
{
    return zvt::fault_hit("alloc") ? nullptr : __real_realloc(block, size);
}

char *__wrap_strdup(const char *string)
{
    return zvt::fault_hit("alloc") ? nullptr : __real_strdup(string);
}

char *__wrap_strndup(const char *string, size_t maximum)
{
    return zvt::fault_hit("alloc") ? nullptr : __real_strndup(string, maximum);
}

}  // extern "C"
