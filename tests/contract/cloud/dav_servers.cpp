#include "dav_servers.h"
#include <csignal>
#include <functional>
#include <glib.h>
#include <gtest/gtest.h>
#include <map>
#include <sys/wait.h>
#include <unistd.h>

namespace {

// What a server is started with, once its folder is there.
struct Setting {
    const TempFolder &place;
    int port;
    std::string user, password;

    std::string address() const
    {
        return "127.0.0.1:" + std::to_string(port);
    }
    // A file of users, as htpasswd makes it.
    std::string users() const
    {
        guint8 digest[20];
        gsize size = sizeof digest;
        GChecksum *sum = g_checksum_new(G_CHECKSUM_SHA1);
        g_checksum_update(sum, reinterpret_cast<const guchar *>(password.data()), static_cast<gssize>(password.size()));
        g_checksum_get_digest(sum, digest, &size);
        g_checksum_free(sum);
        g_autofree char *hash = g_base64_encode(digest, size);
        return place.file("users", user + ":{SHA}" + hash + "\n");
    }
};

struct Kind {
    const char *program;
    const char *root; // path of the tree
    std::function<Headers(const Setting &)> words;
    Headers taboo = {};
    bool needs_no_root = false; // it refuses to serve as root
};

} // namespace

static Headers apache(const Setting &setting)
{
    std::string modules;
    for (const std::string module :
         {"mpm_event", "authn_core", "authn_file", "authz_core", "authz_user", "auth_basic", "dav", "dav_fs"})
        modules += "LoadModule " + module + "_module /usr/lib/apache2/modules/mod_" + module + ".so\n";
    setting.users();
    const std::string config = setting.place.file("httpd.conf", "Define place " + setting.place.path + "\nListen " +
                                                                    setting.address() + "\n" + modules + R"(
ServerRoot ${place}
ServerName 127.0.0.1
PidFile ${place}/pid
ErrorLog ${place}/error.log
DocumentRoot ${place}
DavLockDB ${place}/lock/db
<Directory ${place}/dav>
Dav On
AuthType Basic
AuthName test
AuthUserFile ${place}/users
Require valid-user
</Directory>
)");
    return {"-X", "-f", config};
}

static Headers lighttpd(const Setting &setting)
{
    const std::string config = setting.place.file("lighttpd.conf", R"(
server.document-root = ")" + setting.place.path + R"("
server.bind = "127.0.0.1"
server.port = )" + std::to_string(setting.port) + R"(
server.errorlog = ")" + setting.place.path + R"(/error.log"
server.modules = ("mod_auth", "mod_authn_file", "mod_webdav")
webdav.activate = "enable"
webdav.sqlite-db-name = ")" + setting.place.path + R"(/properties"
auth.backend = "htpasswd"
auth.backend.htpasswd.userfile = ")" + setting.users() + R"("
auth.require = ("" => ("method" => "basic", "realm" => "test", "require" => "valid-user"))
)");
    return {"-D", "-f", config};
}

static Headers nginx(const Setting &setting)
{
    const std::string &place = setting.place.path;
    std::string folders;
    for (const std::string kind : {"client_body", "proxy", "fastcgi", "uwsgi", "scgi"})
        folders += kind + "_temp_path " + place + "/" + kind + ";\n";
    const std::string config = setting.place.file(
        "nginx.conf",
        "load_module /usr/lib/nginx/modules/ngx_http_dav_ext_module.so;\ndaemon off;\nmaster_process off;\n"
        "pid " +
            place + "/pid;\nerror_log " + place + "/error.log;\nevents {}\nhttp {\naccess_log off;\n" + folders +
            "client_max_body_size 0;\nserver {\nlisten " + setting.address() + ";\nroot " + place +
            ";\nlocation /dav/ {\ndav_methods PUT DELETE MKCOL COPY MOVE;\n"
            "dav_ext_methods PROPFIND OPTIONS;\nauth_basic test;\nauth_basic_user_file " +
            setting.users() + ";\n}\n}\n}\n");
    return {"-e", place + "/error.log", "-p", place, "-c", config};
}

// It knows Digest alone, and asks for it of all methods but PUT.
static Headers chezdav(const Setting &setting)
{
    const std::string secret = setting.user + ":test:" + setting.password;
    g_autofree char *hash = g_compute_checksum_for_string(G_CHECKSUM_MD5, secret.c_str(), -1);
    const std::string users = setting.place.file("users", setting.user + ":test:" + hash + "\n");
    return {"--local", "--no-mdns",          "--realm", "test", "--htdigest", users, "-p", std::to_string(setting.port),
            "-P",      setting.place / "dav"};
}

static Headers sabre(const Setting &setting)
{
    const std::string script = setting.place.file("index.php", R"(<?php
error_reporting(0);
require '/usr/share/php/Sabre/autoload.php';
class One extends Sabre\DAV\Auth\Backend\AbstractBasic {
    protected function validateUserPass($user, $password) {
        return $user === ')" + setting.user + R"(' && $password === ')" +
                                                                   setting.password + R"(';
    }
}
$server = new Sabre\DAV\Server(new Sabre\DAV\FS\Directory(__DIR__ . '/dav'));
$server->setBaseUri('/dav/');
$server->addPlugin(new Sabre\DAV\Auth\Plugin(new One(), 'test'));
$server->exec();
)");
    return {"-d", "display_errors=0", "-d",  "post_max_size=0", "-d", "memory_limit=512M",
            "-S", setting.address(),  script};
}

static Headers rclone(const Setting &setting)
{
    return {"--config",        "/dev/null",        "serve", "webdav", setting.place / "dav", "--addr",
            setting.address(), "--baseurl",        "/dav",  "--user", setting.user,          "--pass",
            setting.password,  "--dir-cache-time", "1ms"};
}

static const std::map<std::string, Kind> &kinds()
{
    static const std::map<std::string, Kind> all = {
        {"Apache", {"/usr/sbin/apache2", "/dav", apache, {}, true}},
        {"Lighttpd",
         {"/usr/sbin/lighttpd", "/dav", lighttpd, {"new\nline.txt", "\xff\xfe.bin", std::string(250, 'x') + ".txt"}}},
        {"Nginx", {"/usr/sbin/nginx", "/dav", nginx}},
        {"Chezdav",
         {"/usr/bin/chezdav", "", chezdav, {"a&b;c=d+e.txt", "<b>bold&lt;.txt", "100%.txt", "%41.txt", "#1?.txt"}}},
        {"Sabre", {"/usr/bin/php", "/dav", sabre, {"new\nline.txt", "\xff\xfe.bin"}}},
        {"Rclone", {"/usr/bin/rclone", "/dav", rclone, {"new\nline.txt"}}},
    };
    return all;
}

Headers dav_server_names()
{
    Headers names;
    for (const auto &[name, kind] : kinds())
        if (access(kind.program, X_OK) == 0)
            names.push_back(name);
    return names;
}

std::optional<DavServer> start_dav_server(const std::string &name, const std::string &user, const std::string &password)
{
    const Kind &kind = kinds().at(name);
    const auto place = std::make_shared<TempFolder>();
    const unsigned other_user = kind.needs_no_root && geteuid() == 0 ? 65534 : 0;
    for (const char *folder : {"", "dav", "lock"}) {
        std::filesystem::create_directories(*place / folder);
        if (other_user && chown((*place / folder).c_str(), other_user, other_user) != 0)
            std::abort();
    }
    for (int attempt = 0; attempt < 5; attempt++) {
        const int port = free_port();
        Headers words = kind.words({*place, port, user, password});
        words.insert(words.begin(), kind.program);
        const pid_t pid = spawn(words, *place / "out", *place / "err", other_user);
        bool is_open = false, has_ended = false; // when somebody else took the port
        comes_true([&] {
            is_open = Connection(port).is_open;
            has_ended = waitpid(pid, nullptr, WNOHANG) != 0;
            return is_open || has_ended;
        });
        if (has_ended)
            continue;
        const std::shared_ptr<void> process(nullptr, [pid, place](void *) {
            kill(pid, SIGKILL); // nothing of it is kept
            end_of(pid);
        });
        return DavServer{"http://127.0.0.1:" + std::to_string(port) + kind.root,
                         kind.taboo,
                         *place / "dav",
                         pid,
                         process,
                         other_user != 0};
    }
    ADD_FAILURE() << name << " does not start";
    return {};
}
