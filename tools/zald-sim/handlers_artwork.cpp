// Artwork: one picture per album (a gradient in the album's colour, shifted by the time
// position for pictures asked at a position), handed out through a shared file in a
// private folder or inline in the reply, as the device's artwork settings say; the artwork
// times of the current track; pictures by persistent track identifier.
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cinttypes>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "handlers.h"
#include "sim_log.h"
#include "zal-ipod-2/opcodes.h"

namespace sim {

namespace {

constexpr int32_t kBytesPerPixel = 2;
constexpr int32_t kLittleEndian565 = 2;

// The shared file every picture is written to, in a folder of its own removed at exit.
// The file only grows: a client may still map its old length, and reading a mapped page
// past the end of a shrunk file would kill the client.
class SharedPictureFile {
  public:
    ~SharedPictureFile() {
        if (!path_.empty()) unlink(path_.c_str());
        if (!folder_.empty()) rmdir(folder_.c_str());
    }
    // Writes the pixels; the file's path, or "" (logged) when it cannot be written.
    std::string write(const std::vector<unsigned char> &pixels) {
        if (folder_.empty() && !make_folder()) return "";
        int fd = open(path_.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600);
        if (fd < 0) return fail("open");
        struct stat st {};
        bool ok = fstat(fd, &st) == 0;
        if (ok && st.st_size < static_cast<off_t>(pixels.size()))
            ok = ftruncate(fd, static_cast<off_t>(pixels.size())) == 0;
        size_t done = 0;
        while (ok && done < pixels.size()) {
            ssize_t n =
                pwrite(fd, pixels.data() + done, pixels.size() - done, static_cast<off_t>(done));
            ok = n > 0;
            if (ok) done += static_cast<size_t>(n);
        }
        close(fd);
        return ok ? path_ : fail("write");
    }

  private:
    bool make_folder() {
        char folder[] = "/tmp/zald-sim-artwork-XXXXXX";
        if (mkdtemp(folder) == nullptr) {
            fail("mkdtemp");
            return false;
        }
        folder_ = folder;
        path_ = folder_ + "/picture.raw";
        return true;
    }
    std::string fail(const char *what) {
        SIM_LOGE("zald-sim: artwork file %s: %s: %s\n", path_.c_str(), what, strerror(errno));
        return "";
    }
    std::string folder_;
    std::string path_;
};

SharedPictureFile &shared_file() {
    static SharedPictureFile file;
    return file;
}

// A colour for an album without one of its own: a hash of its name, kept bright.
uint32_t album_color(const Track &t) {
    if (t.album_color != 0) return t.album_color;
    uint32_t h = 2166136261u;
    for (unsigned char ch : t.album) h = (h ^ ch) * 16777619u;
    return (h & 0x7F7F7F) + 0x404040;
}

// Row-major 16-bit pixels: the album's colour fading from the top left corner to the bottom
// right one, the whole gradient moved by `shift` pixels (a time position).
std::vector<unsigned char> picture(const Track &t, const ArtworkSpec &spec, int32_t shift) {
    const uint32_t rgb = album_color(t);
    const int32_t r = (rgb >> 16) & 0xFF, g = (rgb >> 8) & 0xFF, b = rgb & 0xFF;
    const int32_t span = spec.width + spec.height;
    std::vector<unsigned char> out(static_cast<size_t>(spec.width * spec.height * kBytesPerPixel));
    size_t at = 0;
    for (int32_t y = 0; y < spec.height; ++y) {
        for (int32_t x = 0; x < spec.width; ++x) {
            const int32_t level = span - ((x + y + shift) % span);  // span .. 1
            const uint32_t pr = uint32_t(r * level / span) >> 3;
            const uint32_t pg = uint32_t(g * level / span) >> 2;
            const uint32_t pb = uint32_t(b * level / span) >> 3;
            const auto pixel = static_cast<uint16_t>((pr << 11) | (pg << 5) | pb);
            const bool little = spec.pixel_format == kLittleEndian565;
            out[at++] = static_cast<unsigned char>(little ? pixel : pixel >> 8);
            out[at++] = static_cast<unsigned char>(little ? pixel >> 8 : pixel);
        }
    }
    return out;
}

void send_picture(Call &c, const Device &d, const Track &t, int32_t shift) {
    const ArtworkSpec &spec = d.spec.artwork;
    std::vector<unsigned char> pixels = picture(t, spec, shift);
    HashBuilder reply;
    reply.add("width", spec.width)
        .add("height", spec.height)
        .add("rowstride", spec.width * kBytesPerPixel)
        .add("pixel_format", spec.pixel_format);
    if (spec.shared_file) {
        const std::string path = shared_file().write(pixels);
        if (path.empty()) return c.fail("the artwork file cannot be written");
        reply.add("image_path", path);
    } else {
        reply.add("image", serialize_bytes(pixels.data(), static_cast<uint32_t>(pixels.size())));
    }
    c.reply(reply.take());
}

const Track *require_track(Call &c, Device &d) {
    const Track *t = d.current_track();
    if (t == nullptr) c.fail("no track is current");
    return t;
}

// Payload: the device's artwork format number (any is accepted).
void current_artwork(Call &c) {
    Device *d = c.require_session();
    const Track *t = d != nullptr ? require_track(c, *d) : nullptr;
    if (t != nullptr) send_picture(c, *d, *t, 0);
}

// Payload: array (format number, time position in ms); the gradient moves one pixel per
// second of position.
void positioned_artwork(Call &c) {
    Device *d = c.require_session();
    const Track *t = d != nullptr ? require_track(c, *d) : nullptr;
    if (t == nullptr) return;
    int32_t position = 0;
    if (!value_as_int(array_item(c.arg, 1), &position) || position < 0 || position >= t->length_ms)
        return c.fail("the request needs an array: format, position inside the track");
    send_picture(c, *d, *t, position / 1000);
}

// Payload: array of one 8-byte value, the identifier most significant byte first.
void artwork_by_uid(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    const gval *item = array_item(c.arg, 0);
    uint32_t length = 0;
    const void *bytes = item != nullptr && serialize_type(item) == SERIALIZE_BYTES
                            ? serialize_get_bytes(item, &length)
                            : nullptr;
    if (bytes == nullptr || length != 8)
        return c.fail("the request needs an array holding the 8-byte track identifier");
    uint64_t uid = 0;
    for (uint32_t i = 0; i < 8; ++i)
        uid = (uid << 8) | static_cast<const unsigned char *>(bytes)[i];
    const Track *t = d->track_by_uid(uid);
    if (t == nullptr) {
        char text[64];
        snprintf(text, sizeof text, "no track with identifier %016" PRIx64, uid);
        return c.fail(text);
    }
    send_picture(c, *d, *t, 0);
}

// Answer: the request's format number, then the times (ms) at which the picture changes:
// the track's own list, else its chapter starts, else 0.
void artwork_times(Call &c) {
    Device *d = c.require_session();
    const Track *t = d != nullptr ? require_track(c, *d) : nullptr;
    if (t == nullptr) return;
    int32_t format = 0;
    value_as_int(c.arg, &format);
    ValuePtr list(serialize_array());
    serialize_array_add(list.get(), serialize_int(format));
    std::vector<int32_t> times = t->artwork_times_ms;
    if (times.empty())
        for (int32_t i = 0; i < static_cast<int32_t>(t->chapters.size()); ++i)
            times.push_back(chapter_start(*t, i));
    if (times.empty()) times.push_back(0);
    for (int32_t time : times) serialize_array_add(list.get(), serialize_int(time));
    c.reply(std::move(list));
}

}  // namespace

void register_artwork_handlers(HandlerTable &table) {
    table[ZAL_OP_CURRENT_TRACK_ARTWORK] = current_artwork;
    table[ZAL_OP_CURRENT_TRACK_POS_ARTWORK] = positioned_artwork;
    table[ZAL_OP_GET_TRACK_ARTWORK_BY_UID] = artwork_by_uid;
    table[ZAL_OP_CURRENT_TRACK_ARTWORK_TIMES] = artwork_times;
}

}  // namespace sim
