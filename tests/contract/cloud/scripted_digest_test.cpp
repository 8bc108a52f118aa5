// The client and services that ask for Digest authentication. Whether its answers are right a real server tells.
#include "cloud_content_sync/http_digest.h"
#include "scripted_server.h"

TEST(DigestChallenge, the_best_that_can_be_answered)
{
    const struct {
        Names headers;
        std::string algorithm, nonce, realm; // no nonce: none can be
    } rows[] = {
        {{"Basic realm=\"x\""}, "", "", ""},
        {{"Digest realm=\"a, \\\"b\\\"\", nonce=\"n=1,\", qop=\"auth\""}, "", "n=1,", "a, \"b\""},
        {{"Basic realm=\"Digest\", DIGEST Nonce = n , realm=r,qop=\"auth-int, auth\" ,algorithm=md5"}, "md5", "n", "r"},
        {{"Digest realm=\"r\", nonce=\"1\", algorithm=MD5", "Digest realm=\"r\", nonce=\"2\", algorithm=SHA-256"},
         "SHA-256",
         "2",
         "r"},
        {{"Digest realm=\"r\", nonce=\"1\", algorithm=SHA-512-256",
          "Digest realm=\"r\", nonce=\"2\", qop=\"auth-int\""},
         "",
         "",
         ""},
        {{"Digest realm=\"r\"", "Digest", "", ",,=", "Digest nonce=\"unfinished"}, "", "unfinished", ""},
    };
    for (const auto &row : rows) {
        const auto found = cloud::digest_challenge(row.headers);
        EXPECT_EQ(found ? found->nonce : "", row.nonce) << row.headers[0];
        EXPECT_EQ(found ? found->algorithm : "", row.algorithm) << row.headers[0];
        EXPECT_EQ(found ? found->realm : "", row.realm) << row.headers[0];
    }
}

TEST_F(Scripted, a_password_and_a_body_are_sent_to_whom_they_are_for)
{
    std::string nonce = "first", log;
    const auto act = [&](const Request &request) {
        const bool is_answer = request.authorization.starts_with("Digest ");
        const bool is_right = is_answer && request.authorization.find("nonce=\"" + nonce + "\"") != std::string::npos;
        log += request.method + (is_right ? "+ " : is_answer ? "- " : request.authorization.empty() ? " " : "! ");
        if (!is_right)
            return answer("401 Unauthorized", "",
                          "WWW-Authenticate: Digest realm=\"r\", nonce=\"" + nonce +
                              "\", qop=\"auth\", algorithm=SHA-256\r\n");
        if (request.method == "PUT")
            return answer("201 Created", "", request.body == "hello" ? HELLO_DIGEST : WRONG_DIGEST);
        return multistatus(folder("/r%20t/"));
    };
    serve(act);
    // The script runs under the lock that this takes, so each side sees what the other has written.
    const auto meet = [&] { static_cast<void>(server->requests()); };
    const std::string local = scratch.file("hello", "hello");
    for (int i = 0; i < 3; i++) {
        ASSERT_EQ(cloud_content_sync_credentials_set("Test", nullptr, "ann", "secret"), 0);
        const char *const requests[] = {"PROPFIND! PROPFIND+ PUT+ ", "PUT- PUT+ ", "PROPFIND PROPFIND+ PUT+ "};
        EXPECT_EQ(upload(handle, local, "/x"), 0);
        meet();
        EXPECT_EQ(log, requests[i]);
        log.clear();
        nonce += "+";
        meet();
        if (i == 1) { // another process
            cloud_content_sync_destroy(handle);
            ASSERT_EQ(cloud_content_sync_create("Test", &handle), 0);
        }
    }
    server->say(answer("401 Unauthorized", "", "WWW-Authenticate: Digest realm=\"r\", nonce=\"other\"\r\n"));
    EXPECT_EQ(upload(handle, local, "/x"), CLOUD_CONTENT_SYNC_ERROR_UNAUTHORIZED);
    EXPECT_LE(server->requests().size(), 13u);
}
