#include "text/sz_list.h"

#include <algorithm>
#include <cerrno>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <new>

#include "common/failure.h"

namespace kelo::platform {

void ListAppend(TORVSZLIST &list, std::string_view text) {
    if (list.count == list.capacity) {
        if (list.capacity > INT_MAX / 2)
            throw std::bad_alloc();
        const int capacity = std::max(16, list.capacity * 2);
        void *items = std::realloc(list.items, static_cast<size_t>(capacity) * sizeof(char *));
        if (items == nullptr)
            throw std::bad_alloc();
        list.items = static_cast<char **>(items);
        list.capacity = capacity;
    }
    char *copy = strndup(text.data(), text.size());
    if (copy == nullptr)
        throw std::bad_alloc();
    list.items[list.count++] = copy;
}

} // namespace kelo::platform

namespace {

TORVSZLIST *AllocateList(size_t size) {
    if (size > INT_MAX / 2) {
        errno = ENOMEM;
        return nullptr;
    }
    auto *list = static_cast<TORVSZLIST *>(std::calloc(1, sizeof(TORVSZLIST)));
    if (list == nullptr)
        return nullptr;
    list->capacity = static_cast<int>(std::max<size_t>(size, 1));
    list->items = static_cast<char **>(std::calloc(static_cast<size_t>(list->capacity), sizeof(char *)));
    if (list->items == nullptr) {
        std::free(list);
        return nullptr;
    }
    return list;
}

} // namespace

TORVSZLIST *TORVCSzListAlloc(size_t size) {
    return kelo::platform::Recorded("TORVCSzListAlloc", nullptr, AllocateList(size));
}

void TORVCSzListFree(TORVSZLIST *list) {
    if (list == nullptr)
        return;
    for (int i = 0; i < list->count; ++i)
        std::free(list->items[i]);
    std::free(list->items);
    std::free(list);
}
