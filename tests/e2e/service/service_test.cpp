// Who may ask, what names and addresses reach, and what stays known about files.
#include "cloud.h"
#include <csignal>
#include <gtest/gtest.h>
#include <sys/stat.h>

namespace fs = std::filesystem;

// SHA-256 of "abc", from FIPS 180-4's examples.
static const char ABC_HEX[] = "ba7816bf8f01cfea414140de5dae2223b00361a396177a9cb410ff61f20015ad";
static const char ABC_HEADER[] = "sha-256=:ungWv48Bz+pBQUDeXa4iI7ADYaOWF3qctBD/YfIAFa0=:";

static size_t count_of(const std::string &text, const std::string &part)
{
    size_t count = 0;
    for (size_t at = 0; (at = text.find(part, at)) != std::string::npos; at += part.size())
        count++;
    return count;
}

TEST(Service, AsksForCredentials)
{
    Cloud cloud;
    const std::string root = cloud.root;
    const auto tool = [&](const std::string &option, const std::string &value) {
        return run_cloud({"--root", root, option, value});
    };
    EXPECT_EQ(tool("--add-account", "Bob@example.org:word").out, "account Bob@example.org\n");
    const std::string ann = tool("--token", "ann@example.org").out, bob = tool("--token", "bob@example.org").out;
    ASSERT_EQ(ann.size(), 65u);
    EXPECT_NE(ann, tool("--token", "ann@example.org").out);
    EXPECT_EQ(tool("--token", "eve@example.org").code, 1);
    // Not the token itself lies in the database.
    EXPECT_EQ(read_file(cloud.root / "velora-cloud.db").find(ann.substr(0, 64)), std::string::npos);

    const struct {
        std::string authorization;
        int status;
    } cases[] = {
        {"", 401},
        {"Basic", 401},
        {"Basic !!!", 401},
        {"Basic YW5uQGV4YW1wbGUub3Jn", 401},             // no colon
        {"Basic YW5uQGV4YW1wbGUub3JnOg==", 401},         // empty password
        {"Basic YW5uQGV4YW1wbGUub3JnOndvcmQ=", 401},     // ann:word
        {"Basic ZXZlQGV4YW1wbGUub3JnOnNlY3JldA==", 401}, // eve:secret
        {"Basic YW5uQGV4YW1wbGUub3JnOnNlY3JldA==", 200}, // ann:secret
        {"Basic QU5OQGV4YW1wbGUub3JnOnNlY3JldA==", 200}, // ANN:secret
        {"Basic YW5uQGV4YW1wbGUub3JnOnNlY3JldAB4", 401}, // secret, NUL, x
        {"Bearer " + ann.substr(0, 64), 200},
        {"bearer " + ann.substr(0, 64), 200},
        {"Bearer " + ann.substr(0, 63), 401},
        {"Bearer ", 401},
        {"Digest " + ann.substr(0, 64), 401},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.authorization);
        const Headers headers{"Authorization: " + c.authorization};
        for (const std::string method : {"GET", "PUT"}) {
            const Answer answer = method == "GET" ? cloud.ask("GET", "/1/account/info", headers)
                                                  : cloud.ask("PUT", "/dav/file", headers, "x");
            EXPECT_EQ(answer.status, c.status == 200 && method == "PUT" ? 201 : c.status) << method;
            EXPECT_EQ(answer.headers.count("www-authenticate"), c.status == 401 ? 2u : 0u);
        }
        EXPECT_EQ(cloud.ask("DELETE", "/dav/file").status, c.status == 200 ? 204 : 404);
    }
    cloud.ask("PUT", "/dav/file", {}, "x");
    const Headers as_bob{"Authorization: Bearer " + bob.substr(0, 64)};
    EXPECT_EQ(cloud.ask("GET", "/1/account/info", as_bob).body,
              "{\"email\":\"bob@example.org\",\"display_name\":\"Bob\",\"used\":0,\"total\":53687091200}\n");
    EXPECT_EQ(cloud.ask("GET", "/dav/file", as_bob).status, 404);
    EXPECT_EQ(cloud.ask("GET", "/").status, 404);
    EXPECT_EQ(cloud.ask("POST", "/1/account/info").status, 405);
}

TEST(Service, KeepsNamesAsTheyAre)
{
    Cloud cloud;
    const struct {
        std::string address, name; // an empty name: refused
        int status;
    } cases[] = {
        {"a%20b%20%20c", "a b  c", 201},
        {"%3Cb%3Ebold%26%22'", "<b>bold&\"'", 201},
        {"line%0Abreak%09%01", "line\nbreak\t\x01", 201},
        {"%25%23%3F%5C%3B", "%#?\\;", 201},
        {"%E9%A3%9F%F0%9F%8D%9C", "\xE9\xA3\x9F\xF0\x9F\x8D\x9C", 201},
        {".hidden", ".hidden", 201},
        {"...", "...", 201},
        {std::string(255, 'n'), std::string(255, 'n'), 201},
        {std::string(256, 'n'), "", 414},
        {"..", "", 400},
        {"../x", "", 400},
        {"../../ann@example.org/x", "", 400},
        {"%2e%2e/x", "", 400},
        {".%2E/.%2e/tmp/x", "", 400},
        {"a/../../x", "", 400},
        {"a%2Fb", "", 400},
        {"a%00b", "", 400},
        {"a%zz", "", 400},
        {"a%ff", "", 400},
        {"none/x", "", 409},
    };
    size_t stored = 0;
    for (const auto &c : cases) {
        SCOPED_TRACE(c.address);
        const int status = cloud.ask("PUT", "/dav/" + c.address, {}, c.address).status;
        // Dots may be resolved before the address is looked at, and then it lies outside /dav/.
        EXPECT_TRUE(status == c.status || (c.status == 400 && status == 404)) << status;
        if (c.name.empty())
            continue;
        stored++;
        EXPECT_EQ(read_file(cloud.file(c.name)), c.address);
        EXPECT_EQ(cloud.ask("GET", "/dav/" + c.address).body, c.address);
        const std::string listing = cloud.ask("PROPFIND", "/dav/", {"Depth: 1"}).body;
        std::string href = c.address; // what clients may leave bare the service still encodes
        if (const size_t quote = href.find('\''); quote != std::string::npos)
            href.replace(quote, 1, "%27");
        EXPECT_EQ(count_of(listing, "<D:href>/dav/" + href + "</D:href>"), 1u) << listing;
        EXPECT_EQ(count_of(listing, "<D:href>"), stored + 1);
    }
    EXPECT_EQ(static_cast<size_t>(std::distance(fs::recursive_directory_iterator(cloud.root / "files"), {})),
              stored + 1);
    EXPECT_EQ(cloud.temporary_files(), 0u);
}

TEST(Service, FollowsNoLinkOutOfTheAccount)
{
    Cloud cloud;
    const fs::path outside = cloud.root.parent_path() / "outside";
    fs::create_directory(outside);
    write_file(outside / "secret", "kept");
    cloud.ask("MKCOL", "/dav/in/");
    fs::create_symlink(outside / "secret", cloud.file("in/file"));
    fs::create_symlink(outside, cloud.file("in/folder"));
    mkfifo(cloud.file("in/pipe").c_str(), 0600);
    cloud.ask("PUT", "/dav/ours", {}, "ours");
    const std::string to_link = "Destination: " + cloud.url + "/dav/in/";
    const struct {
        const char *method, *path;
        std::string header;
        int status;
    } cases[] = {
        {"GET", "/dav/in/file", "", 404},
        {"GET", "/dav/in/pipe", "", 404},
        {"GET", "/dav/in/folder/secret", "", 404},
        {"PROPFIND", "/dav/in/folder/", "Depth: 1", 404},
        {"PROPPATCH", "/dav/in/file", "", 404},
        {"PUT", "/dav/in/file", "", 403},
        {"PUT", "/dav/in/pipe", "If-None-Match: *", 412},
        {"PUT", "/dav/in/folder/new", "", 409},
        {"MKCOL", "/dav/in/folder/new", "", 409},
        {"DELETE", "/dav/in/file", "", 404},
        {"DELETE", "/dav/in/folder/secret", "", 404},
        {"COPY", "/dav/in/file", to_link + "copy", 404},
        {"COPY", "/dav/ours", to_link + "file", 403},
        {"MOVE", "/dav/ours", to_link + "folder/secret", 409},
        {"MOVE", "/dav/in/folder", to_link + "moved", 404},
        {"COPY", "/dav/ours", "Destination: http://elsewhere.example/dav/x", 502},
        {"COPY", "/dav/ours", "Destination: /dav/%2e%2e/x", 502},
        {"COPY", "/dav/ours", "Destination: /etc/x", 502},
        {"MOVE", "/dav/in/", to_link + "self", 403},
        {"COPY", "/dav/in/", "Destination: /dav/copied", 201}, // without what is odd
        {"DELETE", "/dav/in/", "", 204},
    };
    const char *patch = "<propertyupdate xmlns='DAV:'><set><prop><x xmlns='y'>z</x></prop></set></propertyupdate>";
    for (const auto &c : cases) {
        const std::string body = c.method == std::string("PROPPATCH") ? patch : "";
        EXPECT_EQ(cloud.ask(c.method, c.path, {c.header.empty() ? "X-None: 1" : c.header}, body).status, c.status)
            << c.method << " " << c.path << " " << c.header;
    }
    EXPECT_TRUE(fs::is_empty(cloud.file("copied")));
    EXPECT_FALSE(fs::exists(cloud.file("in")));
    EXPECT_EQ(read_file(outside / "secret"), "kept");
    EXPECT_EQ(std::distance(fs::directory_iterator(outside), {}), 1);
    EXPECT_EQ(read_file(cloud.file("ours")), "ours");
    EXPECT_EQ(cloud.used(), 4);
}

// The digest that the listing of a path gives, "" when it gives none.
static std::string listed_digest(const Cloud &cloud, const std::string &path)
{
    const std::string body = cloud.ask("PROPFIND", path, {"Depth: 0"}).body, tag = "<V:sha256>";
    const size_t at = body.find(tag);
    return at == std::string::npos ? "" : body.substr(at + tag.size(), 64);
}

TEST(Service, KnowsDigests)
{
    Cloud cloud;
    const struct {
        std::string header;
        int status;
    } cases[] = {
        {std::string("Repr-Digest: ") + ABC_HEADER, 201},
        {std::string("Repr-Digest: sha-512=:AAAA:, ") + ABC_HEADER, 201},
        {"Repr-Digest: sha-512=:AAAA:", 201}, // not one that we compute
        {"Repr-Digest: sha-256=:AAAAv48Bz+pBQUDeXa4iI7ADYaOWF3qctBD/YfIAFa0=:", 400},
        {"Repr-Digest: sha-256=:ungW:", 400},
        {"Repr-Digest: sha-256", 400},
        {"Content-Range: bytes 0-2/9", 400},
        {"Content-Encoding: gzip", 415},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.header);
        const Answer put = cloud.ask("PUT", "/dav/abc", {c.header}, "abc");
        EXPECT_EQ(put.status, c.status);
        EXPECT_EQ(put.header("repr-digest"), c.status == 201 ? ABC_HEADER : "");
        EXPECT_EQ(cloud.ask("HEAD", "/dav/abc").status, c.status == 201 ? 200 : 404);
        EXPECT_EQ(cloud.temporary_files(), 0u);
        cloud.ask("DELETE", "/dav/abc");
    }

    cloud.ask("MKCOL", "/dav/one/");
    cloud.ask("PUT", "/dav/one/abc", {}, "abc");
    const std::string patch = "<propertyupdate xmlns='DAV:'><set><prop><note xmlns='urn:test' xml:lang='en'>a&amp;b<i/>"
                              "</note></prop></set></propertyupdate>",
                      note = "<note xmlns=\"urn:test\" xml:lang=\"en\">a&amp;b<i/></note>";
    EXPECT_EQ(cloud.ask("PROPPATCH", "/dav/one/abc", {}, patch).status, 207);
    // They go with the file wherever it goes.
    EXPECT_EQ(cloud.ask("MOVE", "/dav/one/", {"Destination: /dav/two"}).status, 201);
    EXPECT_EQ(cloud.ask("COPY", "/dav/two/", {"Destination: /dav/three"}).status, 201);
    EXPECT_EQ(cloud.ask("COPY", "/dav/two/abc", {"Destination: /dav/five"}).status, 201);
    EXPECT_EQ(cloud.ask("PUT", "/dav/four", {}, "xyz").status, 201);
    EXPECT_EQ(cloud.ask("MOVE", "/dav/five", {"Destination: /dav/four"}).status, 204);
    EXPECT_EQ(cloud.ask("MOVE", "/dav/two/abc", {"Destination: /dav/two"}).status, 403); // it would end itself
    cloud.stop(SIGKILL);
    cloud.start();
    for (const char *path : {"/dav/two/abc", "/dav/three/abc", "/dav/four"}) {
        const Answer head = cloud.ask("HEAD", path);
        EXPECT_EQ(head.header("repr-digest"), ABC_HEADER) << path;
        EXPECT_EQ(head.header("content-length"), "3") << path;
        EXPECT_EQ(listed_digest(cloud, path), ABC_HEX) << path;
        EXPECT_EQ(count_of(cloud.ask("PROPFIND", path, {"Depth: 0"}).body, note), 1u) << path;
    }
    // Nothing is left behind for a new file in the old place.
    cloud.ask("MKCOL", "/dav/one/");
    cloud.ask("PUT", "/dav/one/abc", {}, "xyz");
    EXPECT_EQ(cloud.ask("PROPFIND", "/dav/one/abc", {"Depth: 0"}).body.find("urn:test"), std::string::npos);
    fs::remove(cloud.file("three/abc"));
    cloud.ask("PUT", "/dav/three/abc", {}, "xyz");
    EXPECT_EQ(cloud.ask("PROPFIND", "/dav/three/abc", {"Depth: 0"}).body.find("urn:test"), std::string::npos);

    // Protected properties stay, and the others of the same request with them.
    const Answer refused =
        cloud.ask("PROPPATCH", "/dav/four", {},
                  "<propertyupdate xmlns='DAV:'><remove><prop><note xmlns='urn:test'/></prop></remove>"
                  "<set><prop><sha256 xmlns='urn:velora:dav'>0</sha256></prop></set></propertyupdate>");
    EXPECT_EQ(count_of(refused.body, "403 Forbidden") + count_of(refused.body, "424 Failed"), 2u) << refused.body;
    EXPECT_EQ(count_of(cloud.ask("PROPFIND", "/dav/four", {"Depth: 0"}).body, note), 1u);
    const std::string entities =
        "<!DOCTYPE p [<!ENTITY e SYSTEM 'file:///etc/passwd'>]><propfind xmlns='DAV:'><prop>&e;"
        "</prop></propfind>";
    EXPECT_EQ(cloud.ask("PROPFIND", "/dav/four", {"Depth: 0"}, entities).status, 400);

    // What somebody changed in the tree has no digest of ours, also when its size and time are the old ones.
    const fs::path file = cloud.file("four"), other = cloud.file("other");
    write_file(file, "abcd");
    EXPECT_EQ(cloud.ask("HEAD", "/dav/four").header("repr-digest"), "");
    EXPECT_EQ(listed_digest(cloud, "/dav/four"), "");
    cloud.ask("PUT", "/dav/four", {}, "abc");
    const auto time = fs::last_write_time(file);
    write_file(other, "xyz");
    fs::rename(other, file);
    fs::last_write_time(file, time);
    EXPECT_EQ(cloud.ask("GET", "/dav/four").header("repr-digest"), "");
}

TEST(Service, AnswersPartsAndConditions)
{
    Cloud cloud;
    std::string content;
    for (int i = 0; content.size() < 5 << 20; i++)
        content += std::to_string(i) + " ";
    const std::string etag = cloud.ask("PUT", "/dav/f", {}, content).header("etag");
    const std::string size = std::to_string(content.size()), last = std::to_string(content.size() - 1);
    ASSERT_FALSE(etag.empty());
    const struct {
        std::string method;
        Headers headers;
        int status;
        std::string body, range;
    } cases[] = {
        {"GET", {}, 200, content, ""},
        {"GET", {"Range: bytes=0-4"}, 206, content.substr(0, 5), "bytes 0-4/" + size},
        {"GET",
         {"Range: bytes=-5"},
         206,
         content.substr(content.size() - 5),
         "bytes " + std::to_string(content.size() - 5) + "-" + last + "/" + size},
        {"GET", {"Range: bytes=1000000-"}, 206, content.substr(1000000), "bytes 1000000-" + last + "/" + size},
        {"GET", {"Range: bytes=0-99999999"}, 206, content, "bytes 0-" + last + "/" + size},
        {"GET", {"Range: bytes=" + size + "-"}, 416, "", "bytes */" + size},
        {"GET", {"Range: bytes=0-1,10-11"}, 200, content, ""},
        {"GET", {"Range: lines=1"}, 200, content, ""},
        {"GET", {"Range: bytes=0-4", "If-Range: " + etag}, 206, content.substr(0, 5), "bytes 0-4/" + size},
        {"GET", {"Range: bytes=0-4", "If-Range: \"old\""}, 200, content, ""},
        {"GET", {"If-None-Match: \"old\", " + etag}, 304, "", ""},
        {"HEAD", {"If-None-Match: *"}, 304, "", ""},
        {"GET", {"If-Match: \"old\""}, 412, "", ""},
        {"GET", {"If-Unmodified-Since: Sun, 06 Nov 1994 08:49:37 GMT"}, 412, "", ""},
        {"GET", {"If-Modified-Since: Sun, 06 Nov 2094 08:49:37 GMT"}, 304, "", ""},
        {"PUT", {"If-None-Match: *"}, 412, "", ""},
        {"PUT", {"If-Match: \"old\""}, 412, "", ""},
        {"DELETE", {"If-Match: \"old\""}, 412, "", ""},
        {"MOVE", {"Destination: /dav/g", "If-Match: \"old\""}, 412, "", ""},
        {"PUT", {"If-Match: " + etag}, 204, "", ""}, // and empties it
        {"GET", {"Range: bytes=0-0"}, 416, "", "bytes */0"},
        {"GET", {}, 200, "", ""},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.method + (c.headers.empty() ? "" : " " + c.headers.back()));
        const Answer answer = cloud.ask(c.method, "/dav/f", c.headers);
        EXPECT_EQ(answer.status, c.status);
        EXPECT_TRUE(answer.body == c.body) << answer.body.size();
        EXPECT_EQ(answer.header("content-range"), c.range);
    }
}

TEST(Service, ReadsItsCommandLine)
{
    const struct {
        std::vector<std::string> arguments;
        int code;
    } cases[] = {
        {{"--help"}, 0},
        {{"--root", "ROOT", "--add-account", "a@b.c:d", "--quota", "1M", "--token", "a@b.c"}, 0},
        {{"--listen", "127.0.0.1:0"}, 2},
        {{"--root", "ROOT", "--listen", "127.0.0.1"}, 2},
        {{"--root", "ROOT", "--listen", "127.0.0.1:99999"}, 2},
        {{"--root", "ROOT", "--listen", "somewhere:80"}, 2},
        {{"--root", "ROOT", "--unknown"}, 2},
        {{"--root", "ROOT", "more"}, 2},
        {{"--root", "ROOT", "--add-account", "a@b.c"}, 2},
        {{"--root", "ROOT", "--add-account", "a@b.c:"}, 2},
        {{"--root", "ROOT", "--add-account", "../x@y:z"}, 2},
        {{"--root", "ROOT", "--add-account", "nobody:z"}, 2},
        {{"--root", "ROOT", "--add-account", "a@b.c:d", "--quota", "lots"}, 2},
        {{"--root", "ROOT", "--add-account", "a@b.c:d", "--quota", "-1"}, 2},
        {{"--root", "ROOT", "--add-account", "a@b.c:d", "--quota", "99999999T"}, 2},
        {{"--root", "ROOT", "--fail", "1"}, 2},
        {{"--root", "ROOT", "--fail", "1:200"}, 2},
        {{"--root", "/dev/null/x", "--listen", "127.0.0.1:0"}, 1},
    };
    for (const auto &c : cases) {
        const auto run = run_cloud(c.arguments);
        EXPECT_EQ(run.code, c.code) << c.arguments.back() << run.err;
        EXPECT_EQ(count_of(run.err, "\n"), c.code ? 1u : 0u) << c.arguments.back() << run.err;
    }
    Cloud cloud;
    EXPECT_EQ(run_cloud({"--root", cloud.root, "--listen", "127.0.0.1:0"}).code, 1);
    EXPECT_EQ(run_cloud({"--root", "ROOT", "--listen", "127.0.0.1:" + std::to_string(cloud.port)}).code, 1);
    EXPECT_EQ(cloud.stop(SIGINT), 0);
}
