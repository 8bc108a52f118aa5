// velora-cloud and the WebDAV servers of Debian.
#include "backend.h"
#include "cloud.h"
#include "cloud_content_sync/dav.h"
#include "cloud_content_sync/names.h"
#include "dav_servers.h"
#include "relay.h"
#include <csignal>
#include <cstring>
#include <glib.h>
#include <regex>
#include <sys/wait.h>
#include <unistd.h>

// Signs in to the service whose tree and whose other pages are at these addresses.
static Backend introduce(const std::string &tree, const std::string &url)
{
    const auto descriptions = std::make_shared<TempFolder>();
    const auto describe = [descriptions, url](const std::string &at) {
        descriptions->file("Test.conf",
                           "[Service]\nStorage=" + at + "/\nApi=" + url + "\nWeb=" + url + "\nWaitLimit=0\n");
    };
    describe(tree);
    setenv("CLOUD_SERVICES_DIR", descriptions->path.c_str(), 1);
    EXPECT_EQ(cloud_content_sync_credentials_set("Test", USER, USER, PASSWORD), 0);
    const auto ask = [tree](const char *method, const std::string &path, const std::string &body = "") {
        Headers headers = {basic_authorization(USER, PASSWORD)};
        if (std::string(method) == "PROPFIND")
            headers.emplace_back("Depth: 1");
        return ask_url(method, tree + cloud::percent_encode(path), headers, body);
    };
    Backend backend;
    backend.owned.push_back(descriptions);
    backend.put_relay_between = [describe, tree] {
        const size_t colon = tree.rfind(':'), path = std::min(tree.find('/', colon), tree.size());
        const auto relay = std::make_shared<Relay>(std::stoi(tree.substr(colon + 1)));
        describe(tree.substr(0, colon + 1) + std::to_string(relay->port) + tree.substr(path));
        return relay;
    };
    backend.make_folder = [ask](const std::string &path) { EXPECT_EQ(ask("MKCOL", path).status, 201) << path; };
    backend.remove = [ask](const std::string &path) { EXPECT_EQ(ask("DELETE", path).status, 204) << path; };
    backend.store = [ask](const std::string &path, const std::string &bytes) {
        EXPECT_EQ(ask("PUT", path, bytes).status / 100, 2) << path;
    };
    backend.content = [ask](const std::string &path) {
        const Answer answer = ask("GET", path);
        return answer.status == 200 ? std::optional(answer.body) : std::nullopt;
    };
    backend.list = [ask](const std::string &folder) {
        const Answer answer = ask("PROPFIND", folder, cloud::propfind_body(false));
        cloud::MultistatusReader reader("/dav");
        EXPECT_TRUE(reader.feed(answer.body.data(), answer.body.size()) && reader.finish());
        Names names;
        for (const cloud::DavEntry &entry : reader.entries)
            if (entry.path != folder)
                names.push_back(cloud::name_of(entry.path));
        return names;
    };
    return backend;
}

// What a tag's attribute says; "" when it has none of that name.
static std::string attribute(const std::string &tag, const std::string &name)
{
    std::smatch found;
    const bool is_there = std::regex_search(tag, found, std::regex("\\s" + name + "\\s*=\\s*\"([^\"]*)\""));
    std::string value = is_there ? found[1].str() : "";
    for (const auto &[entity, character] :
         {std::pair("&quot;", "\""), std::pair("&#39;", "'"), std::pair("&#x27;", "'"), std::pair("&lt;", "<"),
          std::pair("&gt;", ">"), std::pair("&amp;", "&")})
        for (size_t at = 0; (at = value.find(entity, at)) != value.npos; at++)
            value.replace(at, std::strlen(entity), character);
    return value;
}

// What a browser sends for a form when its first button is pressed; the person knows her fields by their types.
static std::string filled_in(const std::string &form)
{
    const std::regex field("<(input|button)[^>]*>");
    std::string body;
    bool is_pressed = false;
    for (std::sregex_iterator one(form.begin(), form.end(), field), end; one != end; one++) {
        const std::string tag = one->str(), name = attribute(tag, "name"), type = attribute(tag, "type");
        const bool is_button = tag.starts_with("<button") || type == "submit";
        if (name.empty() || (is_button && std::exchange(is_pressed, true)))
            continue;
        const std::string value = type == "password" ? PASSWORD : type == "email" ? USER : attribute(tag, "value");
        body += (body.empty() ? "" : "&") + cloud::percent_encode(name) + "=" + cloud::percent_encode(value);
    }
    return body;
}

// What a person does at a service's pages, until she is sent to the callback.
static void sign_in_at(const std::string &url, std::string address)
{
    const auto absolute = [&](const std::string &to) { return to.starts_with("/") ? url + to : to; };
    std::string cookies, body;
    for (int i = 0; i < 8; i++) {
        Headers headers = {"Cookie: " + cookies, "Origin: " + url};
        if (!body.empty())
            headers.emplace_back("Content-Type: application/x-www-form-urlencoded");
        const Answer answer = ask_url(body.empty() ? "GET" : "POST", address, headers, body);
        for (auto [cookie, end] = answer.headers.equal_range("set-cookie"); cookie != end; cookie++)
            cookies += (cookies.empty() ? "" : "; ") + cookie->second.substr(0, cookie->second.find(';'));
        body.clear();
        if (const std::string next = answer.header("location"); !next.empty()) {
            if (next.find("/auth_complete") != next.npos && next.find("/authorize") == next.npos)
                return;
            address = absolute(next);
            continue;
        }
        std::smatch form;
        ASSERT_TRUE(std::regex_search(answer.body, form, std::regex("<form[^>]*>"))) << answer.status << answer.body;
        if (const std::string action = attribute(form.str(), "action"); !action.empty())
            address = absolute(action);
        const std::string rest = form.suffix();
        body = filled_in(rest.substr(0, rest.find("</form>")));
        ASSERT_FALSE(body.empty());
    }
    FAIL() << "the pages do not end";
}

static Backend start_velora_cloud()
{
    const auto service = std::make_shared<Cloud>(Headers{"--add-account", USER}, std::string(PASSWORD) + "\n");
    Backend backend = introduce(service->url + "/dav", service->url);
    backend.taboo = {"new\nline.txt", "\xff\xfe.bin"};
    backend.media_url = service->url;
    backend.go_down = [service] { service->stop(SIGTERM); };
    backend.approve = [url = service->url](const std::string &token) {
        sign_in_at(url, url + "/1/oauth/authorize?oauth_token=" + token + "&oauth_callback=" + url +
                            "/auth_complete&locale=en_US");
    };
    backend.is_alive = [url = service->url](const std::string &access) {
        return ask_url("PROPFIND", url + "/dav/", {"Depth: 0", "Authorization: Bearer " + access}).status == 207;
    };
    return backend;
}

// The test puts files there and looks at them behind the server's back: what it lists and what it hides.
static void use_folder(Backend &backend, const std::string &root)
{
    const auto at = [root](const std::string &path) { return root + path; };
    backend.make_folder = [at](const std::string &path) { std::filesystem::create_directory(at(path)); };
    backend.remove = [at](const std::string &path) { std::filesystem::remove_all(at(path)); };
    backend.store = [at](const std::string &path, const std::string &bytes) { write_file(at(path), bytes); };
    backend.content = [at](const std::string &path) {
        return std::filesystem::is_regular_file(at(path)) ? std::optional(read_file(at(path))) : std::nullopt;
    };
    backend.list = [at](const std::string &path) { return names_in(at(path)); };
}

static std::optional<Backend> start_other(const std::string &name)
{
    const auto server = start_dav_server(name, USER, PASSWORD);
    if (!server)
        return {};
    Backend backend = introduce(server->url, server->url);
    if (!server->has_own_user)
        use_folder(backend, server->folder);
    backend.owned.push_back(server->process);
    backend.taboo = server->taboo;
    backend.go_down = [pid = server->pid] { kill(pid, SIGKILL); };
    return backend;
}

Names backend_names()
{
    Names names = dav_server_names();
    names.insert(names.begin(), "VeloraCloud");
    return names;
}

Names server_names()
{
    return backend_names();
}

Names page_names()
{
    return {"VeloraCloud"};
}

std::optional<Backend> start_backend(const std::string &name)
{
    return name == "VeloraCloud" ? start_velora_cloud() : start_other(name);
}
