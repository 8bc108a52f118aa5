// PROPFIND and PROPPATCH (RFC 4918, 9.1 and 9.2), with the quota properties of RFC 4331.
#include "http.h"
#include "xml.h"
#include <cerrno>
#include <cstring>
#include <sys/stat.h>
#include <sys/statvfs.h>

// Folders within folders that one answer may go down to.
static const size_t LEVELS = 256;
static const size_t NAMES_AT_MOST = 256;       // of properties, in one request
static const size_t ANSWER_AT_MOST = 64 << 20; // bytes
static const size_t LARGE_ANSWER = 1 << 20;    // bytes
static const int LARGE_AT_ONCE = 8;
static const gint64 TURN = 10000;           // microseconds
static const off_t LARGE_FOLDER = 64 << 10; // bytes of the folder itself
static const char *const LOCKABLE =
    "<D:lockentry><D:lockscope><D:exclusive/></D:lockscope><D:locktype><D:write/></D:locktype></D:lockentry>"
    "<D:lockentry><D:lockscope><D:shared/></D:lockscope><D:locktype><D:write/></D:locktype></D:lockentry>";
static const char *const XML_TYPE = "application/xml; charset=\"utf-8\"";
static const char *const XML_HEAD = "<?xml version=\"1.0\" encoding=\"utf-8\"?>\n<D:multistatus xmlns:D=\"DAV:\" "
                                    "xmlns:V=\"urn:velora:dav\">\n";

namespace {
enum class Live {
    NONE,
    TYPE,
    LENGTH,
    CONTENT_TYPE,
    ETAG,
    MODIFIED,
    CREATED,
    QUOTA_LEFT,
    QUOTA_USED,
    SHA256,
    LOCKS,
    LOCKABLE
};
struct LiveName {
    const char *ns, *name, *tag;
    Live live;
    bool in_all; // whether an answer to allprop has it
};
const LiveName LIVE[] = {
    {"DAV:", "resourcetype", "D:resourcetype", Live::TYPE, true},
    {"DAV:", "getcontentlength", "D:getcontentlength", Live::LENGTH, true},
    {"DAV:", "getcontenttype", "D:getcontenttype", Live::CONTENT_TYPE, true},
    {"DAV:", "getetag", "D:getetag", Live::ETAG, true},
    {"DAV:", "getlastmodified", "D:getlastmodified", Live::MODIFIED, true},
    {"DAV:", "creationdate", "D:creationdate", Live::CREATED, true},
    {"DAV:", "quota-available-bytes", "D:quota-available-bytes", Live::QUOTA_LEFT, false},
    {"DAV:", "quota-used-bytes", "D:quota-used-bytes", Live::QUOTA_USED, false},
    {"urn:velora:dav", "sha256", "V:sha256", Live::SHA256, true},
    {"DAV:", "lockdiscovery", "D:lockdiscovery", Live::LOCKS, true},
    {"DAV:", "supportedlock", "D:supportedlock", Live::LOCKABLE, true},
};

const LiveName *find_live(const DeadProperty &property)
{
    for (const LiveName &live : LIVE)
        if (property.ns == live.ns && property.name == live.name)
            return &live;
    return nullptr;
}

// A property that was asked for.
struct Wanted {
    DeadProperty property;
    const LiveName *live;
};

// One PROPFIND. It holds the request, works for a while at a time, and then lets others have their turn.
class Propfind : public std::enable_shared_from_this<Propfind> {
  public:
    Propfind(Request &asked, PropfindBody asked_body, int asked_depth)
        : request(asked), kept(asked.shared_from_this()), body(std::move(asked_body)), depth(asked_depth)
    {
        for (const DeadProperty &property : body.properties) {
            wanted.push_back({property, find_live(property)});
            need_digest = need_digest || (wanted.back().live && wanted.back().live->live == Live::SHA256);
            need_dead = need_dead || !wanted.back().live;
        }
        if (body.kind != PropfindBody::NAMED)
            need_digest = need_dead = true;
        struct statvfs disk;
        quota_left = request.account->left();
        if (fstatvfs(request.service->temporary.fd, &disk) == 0)
            quota_left =
                std::min(quota_left, static_cast<int64_t>(disk.f_bavail) * static_cast<int64_t>(disk.f_frsize));
    }

    void begin(const Entry &entry)
    {
        out = XML_HEAD;
        const bool folder = entry.kind == Entry::FOLDER;
        read_locks(request.path);
        respond(entry, request.path.href(folder),
                need_dead ? request.service->metadata.properties(*request.account, request.path) : DeadProperties(),
                need_digest ? request.service->metadata.digest(*request.account, request.path, entry) : "");
        if (folder && depth > 0)
            if (Fd open = open_folder(request.account->folder.fd, request.path, request.path.parts.size()); open)
                enter(std::move(open), request.path);
        request.pause();
        go_on();
    }

  private:
    // A folder whose entries are being told.
    struct Level {
        Fd folder;
        Path path;
        std::vector<Entry> entries;
        size_t next = 0;
        std::unordered_map<std::string, Digest> digests;
        std::unordered_map<std::string, DeadProperties> properties;
    };

    void enter(Fd folder, const Path &path)
    {
        Metadata &metadata = request.service->metadata;
        Level level{std::move(folder), path, {}, 0, {}, {}};
        struct stat info;
        is_waiting = fstat(level.folder.fd, &info) == 0 && info.st_size > LARGE_FOLDER;
        if (!is_waiting && !list_folder(level.folder.fd, level.entries))
            return;
        if (need_digest)
            level.digests = metadata.digests_in(*request.account, path);
        if (need_dead)
            level.properties = metadata.properties_in(*request.account, path);
        levels.push_back(std::move(level));
    }

    // Only so many large answers are made and sent at a time.
    bool take_part()
    {
        Service &service = *request.service;
        if (request.large_answer || service.large_answers >= LARGE_AT_ONCE)
            return request.large_answer != nullptr;
        service.large_answers++;
        request.large_answer =
            std::shared_ptr<void>(&service, [](void *data) { static_cast<Service *>(data)->large_answers--; });
        return true;
    }

    void refuse_for_now()
    {
        request.set_header("Retry-After", "5");
        request.answer(503);
    }

    // A large folder is read on another thread.
    void read_large_folder()
    {
        const auto self = shared_from_this();
        const auto entries = std::make_shared<std::vector<Entry>>();
        in_thread(
            request, [self, entries] { list_folder(self->levels.back().folder.fd, *entries); },
            [self, entries] {
                self->levels.back().entries = std::move(*entries);
                self->is_waiting = false;
                self->go_on();
            });
    }

    void go_on()
    {
        const gint64 end = g_get_monotonic_time() + TURN;
        while (!levels.empty() && !is_waiting && out.size() <= ANSWER_AT_MOST && g_get_monotonic_time() < end)
            tell_next();
        if (request.has_ended())
            return request.unpause(); // nobody waits for it
        if (is_waiting)
            return read_large_folder();
        if (out.size() > ANSWER_AT_MOST)
            request.answer(507);
        else if (out.size() > LARGE_ANSWER && !take_part())
            refuse_for_now();
        else if (levels.empty())
            request.answer(207, XML_TYPE, std::move(out += "</D:multistatus>\n"));
        if (request.is_answered())
            return request.unpause();
        g_idle_add(
            [](gpointer data) -> gboolean {
                const std::unique_ptr<std::shared_ptr<Propfind>> self(static_cast<std::shared_ptr<Propfind> *>(data));
                (*self)->go_on();
                return G_SOURCE_REMOVE;
            },
            new std::shared_ptr<Propfind>(shared_from_this()));
    }

    void tell_next()
    {
        Level &level = levels.back();
        if (level.next == level.entries.size())
            return levels.pop_back();
        const Entry entry = std::move(level.entries[level.next++]);
        const auto digest = level.digests.find(entry.name);
        const auto dead = level.properties.find(entry.name);
        static const DeadProperties none;
        std::string href = level.path.href(true);
        append_encoded(href, entry.name);
        if (entry.kind == Entry::FOLDER)
            href += '/';
        Path below = level.path;
        below.parts.push_back(entry.name);
        read_locks(below);
        respond(entry, href, dead == level.properties.end() ? none : dead->second,
                digest != level.digests.end() && digest->second.valid_for(entry) ? digest->second.sha256 : "");
        if (entry.kind != Entry::FOLDER || depth == 1 || levels.size() > LEVELS)
            return;
        if (Fd open = open_folder(level.folder.fd, Path{{entry.name}, false}, 1); open)
            enter(std::move(open), below);
    }

    void respond(const Entry &entry, const std::string &href, const DeadProperties &dead, const std::string &digest)
    {
        std::string missing;
        out += "<D:response><D:href>" + href + "</D:href><D:propstat><D:prop>";
        if (body.kind != PropfindBody::NAMED) {
            for (const LiveName &live : LIVE)
                if (live.in_all || body.kind == PropfindBody::NAMES)
                    append_live(live, entry, digest);
            for (const DeadProperty &property : dead)
                append_dead(property);
        }
        for (const Wanted &item : wanted) {
            if (item.live && item.live->in_all && body.kind == PropfindBody::ALL)
                continue;
            const DeadProperty *stored = nullptr;
            for (const DeadProperty &property : dead)
                if (property.ns == item.property.ns && property.name == item.property.name)
                    stored = &property;
            if (stored && body.kind == PropfindBody::NAMED)
                append_dead(*stored);
            else if (!stored && (!item.live || !append_live(*item.live, entry, digest)))
                append_empty_element(missing, item.property);
        }
        out += "</D:prop><D:status>HTTP/1.1 200 OK</D:status></D:propstat>";
        if (!missing.empty())
            out +=
                "<D:propstat><D:prop>" + missing + "</D:prop><D:status>HTTP/1.1 404 Not Found</D:status></D:propstat>";
        out += "</D:response>\n";
    }

    void read_locks(const Path &path)
    {
        if (!request.service->locks.empty())
            locks = request.service->locks.discovery(request.account->id, path);
    }

    void append_dead(const DeadProperty &property)
    {
        if (body.kind == PropfindBody::NAMES)
            append_empty_element(out, property);
        else
            out += property.xml;
    }

    // The value of a live property as text within XML; false when the entry does not have it.
    bool live_value(Live live, const Entry &entry, const std::string &digest, std::string &value)
    {
        const bool file = entry.kind == Entry::FILE;
        switch (live) {
        case Live::TYPE:
            value = file ? "" : "<D:collection/>";
            return true;
        case Live::LENGTH:
            value = std::to_string(entry.size);
            return file;
        case Live::CONTENT_TYPE:
            if (file)
                append_text(value, type_of(entry.name));
            return file;
        case Live::ETAG:
            if (file)
                append_text(value, entry.etag());
            return file;
        case Live::MODIFIED:
            value = http_date(entry.modified);
            return true;
        case Live::CREATED: {
            const time_t seconds = entry.created / 1000000000;
            struct tm parts;
            char text[32];
            gmtime_r(&seconds, &parts);
            std::strftime(text, sizeof text, "%Y-%m-%dT%H:%M:%SZ", &parts);
            value = text;
            return true;
        }
        case Live::QUOTA_LEFT:
            value = std::to_string(quota_left);
            return !file;
        case Live::QUOTA_USED:
            // With what uploads may still add, so that used and left make one sum while they run.
            value = std::to_string(request.account->stored() + request.account->reserved);
            return !file;
        case Live::SHA256:
            value = digest;
            return !digest.empty();
        case Live::LOCKS:
            value = locks;
            return true;
        case Live::LOCKABLE:
            value = LOCKABLE;
            return true;
        default:
            return false;
        }
    }

    bool append_live(const LiveName &name, const Entry &entry, const std::string &digest)
    {
        std::string value;
        if (!live_value(name.live, entry, digest, value))
            return false;
        out += std::string("<") + name.tag;
        if (value.empty() || body.kind == PropfindBody::NAMES)
            out += "/>";
        else
            out += ">" + value + "</" + name.tag + ">";
        return true;
    }

    // Types are looked up once per ending of a name.
    const std::string &type_of(const std::string &name)
    {
        const size_t dot = name.find('.');
        const std::string ending = dot == std::string::npos ? name : name.substr(dot);
        const auto known = types.find(ending);
        return known != types.end() ? known->second : types.emplace(ending, content_type(name)).first->second;
    }

    Request &request;
    const std::shared_ptr<Message> kept;
    const PropfindBody body;
    const int depth; // 0, 1 or more
    std::vector<Level> levels;
    bool is_waiting = false; // for the entries of the last level
    std::vector<Wanted> wanted;
    bool need_digest = false, need_dead = false;
    int64_t quota_left = 0;
    std::unordered_map<std::string, std::string> types;
    std::string locks; // lockdiscovery of the entry at hand
    std::string out;
};
} // namespace

void dav_propfind(Request &request)
{
    const char *header = request.header("Depth");
    const std::string depth = header ? header : "infinity";
    if (depth != "0" && depth != "1" && g_ascii_strcasecmp(depth.c_str(), "infinity") != 0)
        return request.answer(400);
    PropfindBody body;
    if (!read_propfind(request.body, body))
        return request.answer(400);
    if (body.properties.size() > NAMES_AT_MOST)
        return request.answer(413);
    const Entry entry = request.look_up();
    if (entry.kind != Entry::FILE && entry.kind != Entry::FOLDER)
        return request.answer(404);
    std::make_shared<Propfind>(request, std::move(body), depth == "0" ? 0 : depth == "1" ? 1 : 2)->begin(entry);
}

void dav_proppatch(Request &request)
{
    std::vector<PropertyUpdate> updates;
    if (!read_proppatch(request.body, updates))
        return request.answer(400);
    if (updates.size() > NAMES_AT_MOST)
        return request.answer(413);
    const Entry entry = request.look_up();
    if (entry.kind != Entry::FILE && entry.kind != Entry::FOLDER)
        return request.answer(404);
    if (const int status = check_conditions(request, entry))
        return request.answer(status);
    if (!may_change(request, request.path, Reach::CONTENT))
        return request.answer(423);
    DeadProperties changes;
    std::string refused, others;
    for (const PropertyUpdate &update : updates) {
        append_empty_element(find_live(update.property) ? refused : others, update.property);
        changes.push_back(update.property);
    }
    if (refused.empty() && !request.service->metadata.change_properties(*request.account, request.path, changes))
        return request.answer(507);
    std::string out = XML_HEAD;
    out += "<D:response><D:href>" + request.path.href(entry.kind == Entry::FOLDER) + "</D:href>";
    if (!refused.empty())
        out += "<D:propstat><D:prop>" + refused +
               "</D:prop><D:status>HTTP/1.1 403 Forbidden</D:status><D:error><D:cannot-modify-protected-property/>"
               "</D:error></D:propstat>";
    if (!others.empty())
        out += "<D:propstat><D:prop>" + others + "</D:prop><D:status>HTTP/1.1 " +
               (refused.empty() ? "200 OK" : "424 Failed Dependency") + "</D:status></D:propstat>";
    out += "</D:response>\n</D:multistatus>\n";
    request.answer(207, XML_TYPE, out);
}
