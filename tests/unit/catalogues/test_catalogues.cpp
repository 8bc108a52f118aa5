// The built catalogues, read the way the application reads them: by gettext, from the locale folder.
// C.UTF-8 is on every machine, and gettext obeys LANGUAGE in it (it never does in the locale "C").
#include <gtest/gtest.h>

#include <clocale>
#include <cstdlib>
#include <fstream>
#include <libintl.h>
#include <string>
#include <vector>

extern "C" int _nl_msg_cat_cntr; // gettext's own: a changed LANGUAGE counts from the next change of this on

namespace {

std::vector<std::string> read_words(const std::string &path)
{
    std::ifstream file(path);
    std::vector<std::string> words;
    for (std::string word; file >> word;)
        words.push_back(word);
    return words;
}

const std::vector<std::string> &languages()
{
    static const std::vector<std::string> all = read_words(PO_DIR "/LINGUAS");
    return all;
}

// The message ids of a domain, from its English source; ids stand on one line each.
std::vector<std::string> ids_of(const std::string &domain)
{
    std::ifstream file(PO_DIR "/" + domain + "/en.po");
    std::vector<std::string> ids;
    const std::string start = "msgid \"";
    for (std::string line; std::getline(file, line);)
        if (line.compare(0, start.size(), start) == 0 && line.size() > start.size() + 1)
            ids.push_back(line.substr(start.size(), line.size() - start.size() - 1));
    return ids;
}

std::string translated(const std::string &language, const std::string &domain, const std::string &id)
{
    setenv("LANGUAGE", language.c_str(), 1);
    ++_nl_msg_cat_cntr;
    return dcgettext(domain.c_str(), id.c_str(), LC_MESSAGES);
}

class Catalogues : public testing::Test {
  protected:
    void SetUp() override
    {
        ASSERT_NE(setlocale(LC_ALL, "C.UTF-8"), nullptr);
        for (const char *domain : {"velora", "velora-share"}) {
            bindtextdomain(domain, LOCALE_DIR);
            bind_textdomain_codeset(domain, "UTF-8");
        }
        ASSERT_GE(languages().size(), 6u);
    }
};

TEST_F(Catalogues, every_id_has_a_text_in_every_language)
{
    for (const char *domain : {"velora", "velora-share"}) {
        const std::vector<std::string> ids = ids_of(domain);
        ASSERT_GE(ids.size(), 12u) << domain;
        for (const std::string &language : languages())
            for (const std::string &id : ids) {
                const std::string text = translated(language, domain, id);
                EXPECT_NE(text, "") << language << ' ' << id;
                // A text that is its own English id has that text in English only.
                if (id.compare(0, 4, "IDS_") == 0 || language != "en") {
                    EXPECT_NE(text, id) << language;
                }
            }
    }
}

// A catalogue in the wrong folder would show one language's words to the speakers of another.
TEST_F(Catalogues, languages_are_told_apart)
{
    const struct {
        const char *language, *text;
    } cases[] = {{"en", "Done"},  {"de", "Fertig"},  {"de_AT", "Fertig"}, {"fr_CA", "Terminé"},
                 {"es", "Hecho"}, {"ko_KR", "완료"}, {"zh_CN", "完成"},   {"xx:en", "Done"}};
    for (const auto &c : cases)
        EXPECT_EQ(translated(c.language, "velora-share", "IDS_TPLATFORM_ACBUTTON_DONE_ABB"), c.text) << c.language;
}

// A text that tells the reader to tap a button has to call the button by its label.
TEST_F(Catalogues, texts_name_the_buttons_by_their_labels)
{
    const struct {
        const char *text, *button;
    } cases[] = {{"IDS_KQ_POP_TAP_UPLOAD_TO_TRY_AGAIN", "IDS_KQ_BUTTON_UPLOAD"},
                 {"IDS_VELORA_STATE_EMPTY_TEXT", "IDS_TPLATFORM_ACBUTTON_DONE_ABB"}};
    for (const std::string &language : languages())
        for (const auto &c : cases)
            EXPECT_NE(translated(language, "velora-share", c.text).find(translated(language, "velora-share", c.button)),
                      std::string::npos)
                << language << ' ' << c.text;
}

} // namespace
