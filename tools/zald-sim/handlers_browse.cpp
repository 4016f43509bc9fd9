// The media browser's filtered queries, answered from the device's media library for
// devices of either protocol: a filter is the path of names a browser walked (category,
// item, category, ...), sent after the query's numbers; the queries count and list the
// items of the category at its end, or the identifiers of the tracks it lists, and give
// the collection identifier of an item of a top-level category.
#include <string>
#include <vector>

#include "handlers.h"
#include "zal-ipod-2/opcodes.h"

namespace sim {

namespace {

// A filter read from a request: its steps and the category it ends with.
struct Path {
    Filter filter;
    int32_t category = kCategoryTop;
};

// Reads [levels, <numbers - 1 more integers>, names...] into path and the integers after
// levels into numbers; answers ERROR and returns false when the request is malformed.
bool read_path(Call &c, uint32_t numbers, std::vector<int32_t> *values, Path *path) {
    int32_t levels = 0;
    if (!value_as_int(array_item(c.arg, 0), &levels) || levels < 0) {
        c.fail("the filter needs its number of levels first");
        return false;
    }
    for (uint32_t i = 1; i < numbers; ++i) {
        int32_t v = 0;
        if (!value_as_int(array_item(c.arg, i), &v)) {
            c.fail("the query needs " + std::to_string(numbers) + " integers before its names");
            return false;
        }
        values->push_back(v);
    }
    if (serialize_array_count(c.arg) != static_cast<int>(numbers) + levels) {
        c.fail("the filter has not as many names as levels");
        return false;
    }
    if (levels % 2 == 0) {
        c.fail("the filter must end with a category");
        return false;
    }
    std::vector<std::string> names;
    for (int32_t i = 0; i < levels; ++i) {
        std::string name;
        if (!value_as_string(array_item(c.arg, numbers + static_cast<uint32_t>(i)), &name)) {
            c.fail("the names of the filter must be texts");
            return false;
        }
        names.push_back(std::move(name));
    }
    for (size_t i = 0; i < names.size(); i += 2) {
        const int32_t category = category_by_name(names[i]);
        if (category < 0) {
            c.fail("unknown category \"" + names[i] + "\"");
            return false;
        }
        if (i + 1 < names.size())
            path->filter.push_back({category, names[i + 1]});
        else
            path->category = category;
    }
    return true;
}

// Page [offset, offset+count) of a list of size total, clipped.
void clip(int32_t total, int32_t offset, int32_t count, int32_t *first, int32_t *n) {
    *first = offset < 0 ? 0 : (offset < total ? offset : total);
    *n = count < 0 ? 0 : (count < total - *first ? count : total - *first);
}

// [levels, names...] -> {"count_items_category": n}
void count_items(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    std::vector<int32_t> numbers;
    Path path;
    if (!read_path(c, 1, &numbers, &path)) return;
    c.reply(HashBuilder()
                .add("count_items_category", d->spec.library.count(path.category, path.filter))
                .take());
}

// [levels, offset, count, names...] -> [total, names of the page...]
void get_items(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    std::vector<int32_t> numbers;
    Path path;
    if (!read_path(c, 3, &numbers, &path)) return;
    const auto names = d->spec.library.items(path.category, path.filter);
    int32_t first = 0, n = 0;
    clip(static_cast<int32_t>(names.size()), numbers[0], numbers[1], &first, &n);
    ValuePtr list(serialize_array_reserve(1 + static_cast<uint32_t>(n)));
    serialize_array_add(list.get(), serialize_int(static_cast<int32_t>(names.size())));
    for (int32_t i = first; i < first + n; ++i)
        serialize_array_add(list.get(), serialize_string(names[static_cast<size_t>(i)].c_str()));
    c.reply(std::move(list));
}

// [levels, names...] -> {"count_item_identifiers": n}
void count_identifiers(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    std::vector<int32_t> numbers;
    Path path;
    if (!read_path(c, 1, &numbers, &path)) return;
    const auto tracks = d->spec.library.listed(path.category, path.filter);
    c.reply(
        HashBuilder().add("count_item_identifiers", static_cast<int32_t>(tracks.size())).take());
}

// [levels, offset, count, identifiers_only, names...] -> [n, per track: identifier (decimal
// text), or identifier, name, duration (ms), artist, album, genre]
void get_identifiers(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    std::vector<int32_t> numbers;
    Path path;
    if (!read_path(c, 4, &numbers, &path)) return;
    const auto tracks = d->spec.library.listed(path.category, path.filter);
    int32_t first = 0, n = 0;
    clip(static_cast<int32_t>(tracks.size()), numbers[0], numbers[1], &first, &n);
    const bool ids_only = numbers[2] != 0;
    ValuePtr list(serialize_array_reserve(1 + static_cast<uint32_t>(n) * (ids_only ? 1 : 6)));
    serialize_array_add(list.get(), serialize_int(n));
    for (int32_t i = first; i < first + n; ++i) {
        const LibraryTrack &t = *tracks[static_cast<size_t>(i)];
        serialize_array_add(list.get(), serialize_string(std::to_string(t.uid).c_str()));
        if (ids_only) continue;
        for (const std::string &field :
             {t.title, std::to_string(t.length_ms), t.artist, t.album, t.genre})
            serialize_array_add(list.get(), serialize_string(field.c_str()));
    }
    c.reply(std::move(list));
}

// [category name, item index] -> {"collection_id": decimal text}
void collection_id(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    std::string name;
    int32_t index = 0;
    if (!value_as_string(array_item(c.arg, 0), &name) ||
        !value_as_int(array_item(c.arg, 1), &index))
        return c.fail("GET_COLLECTION_ID needs a category name and an item index");
    const int32_t category = category_by_name(name);
    if (category < 0 || collection_type_of(category) < 0)
        return c.fail("\"" + name + "\" is no category of collections");
    const MediaLibrary &lib = d->spec.library;
    const auto items = lib.items(category, {});
    if (index < 0 || index >= static_cast<int32_t>(items.size()))
        return c.fail("no item " + std::to_string(index) + " in " + name);
    const uint64_t id = lib.identifier(category, items[static_cast<size_t>(index)]);
    c.reply(HashBuilder().add("collection_id", std::to_string(id)).take());
}

}  // namespace

void register_browse_handlers(HandlerTable &table) {
    table[ZAL_OP_COUNT_ITEMS_CURRENT_CATEGORY] = count_items;
    table[ZAL_OP_GET_ITEMS_CURRENT_CATEGORY] = get_items;
    table[ZAL_OP_COUNT_ITEMS_IDENTIFIER_CURRENT_FILTER] = count_identifiers;
    table[ZAL_OP_GET_ITEMS_IDENTIFIER_CURRENT_FILTER] = get_identifiers;
    table[ZAL_OP_GET_COLLECTION_ID] = collection_id;
}

}  // namespace sim
