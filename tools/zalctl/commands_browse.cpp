// Browse: walk the device's media library with the media browser. A path of category names
// and item indices ("artist 3 album") is walked from the top; the end of the walk is listed
// (the items of a category, a page at a time, or the categories beneath an item), played
// (--play), or explored further from the keyboard (-i: one command a line on stdin).
#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cctype>
#include <cstdio>
#include <iostream>
#include <string>
#include <vector>

#include "zalctl.h"

namespace zalctl {

namespace {

constexpr int kCategoryTrack = 5;
constexpr int kCategoryAudiobook = 7;
constexpr int kCategoryGeniusMixes = 10;

struct BrowseOptions {
    std::vector<std::string> path;
    int offset = 0;
    int count = 50;
    bool play = false;
    bool interactive = false;
};

bool is_index(const std::string &token) {
    return !token.empty() && std::all_of(token.begin(), token.end(),
                                         [](unsigned char c) { return std::isdigit(c) != 0; });
}

std::string upper(std::string text) {
    for (char &c : text) c = static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
    return text;
}

// Category number of a name in any case; -1 when it names none (TOP is no walk step).
int category_of(const std::string &token) {
    const int c = zal_ipod_string_to_category(upper(token).c_str());
    return c > 0 ? c : -1;
}

// The path alternates category, index, category, ...
void check_path(const BrowseOptions &o) {
    for (size_t i = 0; i < o.path.size(); ++i) {
        const std::string &t = o.path[i];
        if (i % 2 == 0 && category_of(t) < 0)
            throw CLI::ValidationError("browse", "\"" + t +
                                                     "\" is no category (playlist, artist, "
                                                     "album, genre, track, composer, ...)");
        if (i % 2 == 1 && !is_index(t))
            throw CLI::ValidationError("browse", "\"" + t + "\" is no item index");
    }
    if (o.play && o.path.size() % 2 == 1)
        throw CLI::ValidationError("browse", "--play needs a path that ends with an item index");
}

std::vector<std::string> take_list(char **list) {
    std::vector<std::string> out;
    if (list == nullptr) return out;
    for (int i = 0; list[i] != nullptr; ++i) {
        out.emplace_back(list[i]);
        free(list[i]);
    }
    free(list);
    return out;
}

// The library writes a few diagnostic lines of its own on standard output (the start index
// of a list it plays, reads outside the cached page); while it works, they go to stderr with
// --verbose and nowhere otherwise, so that the output stays ours (and JSON stays JSON).
class QuietStdout {
  public:
    explicit QuietStdout(bool verbose) {
        fflush(stdout);
        saved_ = dup(STDOUT_FILENO);
        const int target = verbose ? dup(STDERR_FILENO) : open("/dev/null", O_WRONLY);
        if (saved_ >= 0 && target >= 0) dup2(target, STDOUT_FILENO);
        if (target >= 0) close(target);
    }
    ~QuietStdout() {
        fflush(stdout);
        if (saved_ >= 0) {
            dup2(saved_, STDOUT_FILENO);
            close(saved_);
        }
    }
    QuietStdout(const QuietStdout &) = delete;
    QuietStdout &operator=(const QuietStdout &) = delete;

  private:
    int saved_ = -1;
};

// One browser on one handle: walks, lists and plays, with failures as Failure.
class Browser {
  public:
    Browser(Session &s, const BrowseOptions &o) : s_(s), o_(o), h_(s.with_session()) {}

    void reset() {
        if (zal_ipod_media_lib_reset_selection(h_, 1) != 1)
            throw Failure("browse: the device did not go back to the top of its library");
    }

    int levels() const { return zal_ipod_media_lib_get_current_selection_count(h_); }
    bool category_on_top() const { return levels() % 2 == 1; }

    void select_category(int category) {
        if (zal_ipod_media_lib_select_category(h_, category) != 1)
            s_.expect(-1, (std::string("select ") + zal_ipod_category_to_string(category)).c_str());
    }

    // Item index (absolute) of the category on top.
    void select_item(int index) {
        const int total = s_.expect(zal_ipod_media_lib_get_items_count(h_), "count items");
        if (index >= total)
            throw Failure("no item " + std::to_string(index) + " (the category has " +
                          std::to_string(total) + ")");
        // The page that holds the item, so that its name is known.
        take_list(zal_ipod_media_lib_get_items(h_, index, 1));
        if (zal_ipod_media_lib_select_item(h_, 0) != 1) s_.expect(-1, "select item");
    }

    void walk(const std::vector<std::string> &path) {
        QuietStdout quiet(s_.options.verbose);
        for (size_t i = 0; i < path.size(); ++i) {
            if (i % 2 == 0)
                select_category(category_of(path[i]));
            else
                select_item(std::stoi(path[i]));
        }
    }

    // Undo one level.
    void back() {
        QuietStdout quiet(s_.options.verbose);
        const int n = levels();
        if (n == 0) return;
        if (zal_ipod_media_lib_undo_selection(h_, n - 1) != 1) s_.expect(-1, "back");
    }

    // Plays the item on top: a track (or audiobook, Genius mix) itself, anything else from
    // the first of its tracks.
    void play() {
        QuietStdout quiet(s_.options.verbose);
        const int n = levels();
        if (n == 0 || category_on_top()) throw Failure("play: choose an item first");
        std::vector<std::string> selection =
            take_list(zal_ipod_media_lib_get_current_selection(h_));
        const int chosen_from =
            zal_ipod_string_to_category(selection[static_cast<size_t>(n - 2)].c_str());
        const bool playable = chosen_from == kCategoryTrack || chosen_from == kCategoryAudiobook ||
                              chosen_from == kCategoryGeniusMixes;
        const int index = playable ? zal_ipod_media_lib_get_current_selection_start_index(h_) : 0;
        if (zal_ipod_media_lib_play_current_selection(h_, index) != 1) s_.expect(-1, "play");
    }

    // What is offered at the current level: the items of the category on top (a page) or
    // the categories beneath the item on top.
    Json listing(int offset, int count) {
        QuietStdout quiet(s_.options.verbose);
        Json doc;
        doc["selection"] = take_list(zal_ipod_media_lib_get_current_selection(h_));
        if (category_on_top()) {
            const int total = s_.expect(zal_ipod_media_lib_get_items_count(h_), "count items");
            const int first = std::min(offset, total);
            const int n = std::min(count, total - first);
            doc["total"] = total;
            doc["offset"] = first;
            doc["items"] = n > 0 ? take_list(zal_ipod_media_lib_get_items(h_, first, n))
                                 : std::vector<std::string>{};
            if (n > 0 && doc["items"].empty()) s_.expect(-1, "list items");
        } else {
            doc["categories"] = take_list(zal_ipod_media_lib_get_categories(h_));
        }
        return doc;
    }

    void print(const Json &doc) const {
        if (s_.options.json) {
            print_json(doc);
            return;
        }
        std::string where;
        for (const auto &name : doc["selection"]) where += " / " + name.get<std::string>();
        printf("%s\n", where.empty() ? "/" : where.c_str() + 1);
        if (doc.contains("categories")) {
            if (doc["categories"].empty()) printf("  (a leaf: play it)\n");
            int i = 0;
            for (const auto &name : doc["categories"])
                printf("  %d  %s\n", i++, name.get<std::string>().c_str());
            return;
        }
        const int first = doc["offset"].get<int>();
        int i = first;
        for (const auto &name : doc["items"])
            printf("  %d  %s\n", i++, name.get<std::string>().c_str());
        printf("  (%d-%d of %d)\n", doc["items"].empty() ? first : first + 1, i,
               doc["total"].get<int>());
    }

    void print_now_playing() {
        const Json np = now_playing(s_);
        if (s_.options.json)
            print_json(Json{{"command", "play"}, {"now_playing", np}});
        else
            printf("%s\n", now_playing_line(np).c_str());
    }

    // Commands from stdin, one a line: a number chooses (an item of the category on top, or
    // the n-th category offered), "b" goes back, "p" plays, "n"/"N" turn the page, "q" (or
    // the end of the input) quits. A failing command is reported and the walk goes on.
    void interactive(int offset) {
        const bool prompt = isatty(STDIN_FILENO) != 0;
        print(listing(offset, o_.count));
        for (std::string line;;) {
            if (prompt) {
                printf("> ");
                fflush(stdout);
            }
            if (!std::getline(std::cin, line)) break;
            line.erase(0, line.find_first_not_of(" \t"));
            line.erase(line.find_last_not_of(" \t\r") + 1);
            if (line.empty()) continue;
            if (line == "q") break;
            try {
                if (line == "b") {
                    back();
                    offset = 0;
                } else if (line == "p") {
                    play();
                    print_now_playing();
                    continue;
                } else if (line == "n" || line == "N") {
                    offset = std::max(0, offset + (line == "n" ? o_.count : -o_.count));
                } else if (is_index(line)) {
                    choose(std::stoi(line));
                    offset = 0;
                } else {
                    fprintf(stderr,
                            "zalctl: \"%s\": a number chooses, b goes back, p plays, "
                            "n/N turn the page, q quits\n",
                            line.c_str());
                    continue;
                }
                print(listing(offset, o_.count));
            } catch (const Failure &e) {
                fflush(stdout);
                fprintf(stderr, "zalctl: %s\n", e.what());
            }
        }
    }

  private:
    void choose(int n) {
        QuietStdout quiet(s_.options.verbose);
        if (category_on_top()) {
            select_item(n);
            return;
        }
        const std::vector<std::string> offered = take_list(zal_ipod_media_lib_get_categories(h_));
        if (n >= static_cast<int>(offered.size()))
            throw Failure("no category " + std::to_string(n) + " here");
        select_category(zal_ipod_string_to_category(offered[static_cast<size_t>(n)].c_str()));
    }

    Session &s_;
    const BrowseOptions &o_;
    zal_ipod_handle *h_;
};

void run_browse(Session &s, const BrowseOptions &o) {
    Browser b(s, o);
    b.reset();
    b.walk(o.path);
    if (o.interactive) {
        b.interactive(o.offset);
        return;
    }
    if (o.play) {
        b.play();
        b.print_now_playing();
        return;
    }
    b.print(b.listing(o.offset, o.count));
}

}  // namespace

void add_browse_commands(CLI::App &app, Session &s) {
    static BrowseOptions o;
    CLI::App *sub = app.add_subcommand(
        "browse",
        "Walk the media library: a path of categories and item indices from the top "
        "(\"artist 3 album\"); lists what is offered there, or plays the item the path ends "
        "with");
    sub->add_option("path", o.path, "category, index, category, ... (e.g. artist 3 album 0)");
    sub->add_option("--offset", o.offset, "First item listed")->check(CLI::NonNegativeNumber);
    sub->add_option("--count", o.count, "Items listed at most")->check(CLI::PositiveNumber);
    sub->add_flag("--play", o.play, "Play the item the path ends with");
    sub->add_flag("-i,--interactive", o.interactive,
                  "Go on from stdin: a number chooses, b back, p play, n/N page, q quit");
    sub->parse_complete_callback([] { check_path(o); });
    on_run(sub, s, [&s] { run_browse(s, o); });
}

}  // namespace zalctl
