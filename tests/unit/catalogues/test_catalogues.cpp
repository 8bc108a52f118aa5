// The built catalogues, read the way the application reads them: by gettext, from the locale folder.
// C.UTF-8 is on every machine, and gettext obeys LANGUAGE in it (it never does in the locale "C").
#include <gtest/gtest.h>

#include <clocale>
#include <cstdlib>
#include <fstream>
#include <libintl.h>
#include <string>

extern "C" int _nl_msg_cat_cntr; // gettext's own: a changed LANGUAGE counts from the next change of this on

namespace {

std::string translated(const std::string &language, const std::string &id)
{
    setenv("LANGUAGE", language.c_str(), 1);
    ++_nl_msg_cat_cntr;
    return dcgettext("velora-share", id.c_str(), LC_MESSAGES);
}

class Catalogues : public testing::Test {
  protected:
    void SetUp() override
    {
        ASSERT_NE(setlocale(LC_ALL, "C.UTF-8"), nullptr);
        bindtextdomain("velora-share", LOCALE_DIR);
        bind_textdomain_codeset("velora-share", "UTF-8");
    }
};

// A catalogue in the wrong folder would show one language's words to the speakers of another.
TEST_F(Catalogues, languages_are_told_apart)
{
    const struct {
        const char *language, *text;
    } cases[] = {{"en", "Done"},  {"de", "Fertig"},  {"de_AT", "Fertig"}, {"fr_CA", "Terminé"},
                 {"es", "Hecho"}, {"ko_KR", "완료"}, {"zh_CN", "完成"},   {"xx:en", "Done"}};
    for (const auto &c : cases)
        EXPECT_EQ(translated(c.language, "IDS_TPLATFORM_ACBUTTON_DONE_ABB"), c.text) << c.language;
}

// A text that tells the reader to tap a button has to call the button by its label.
TEST_F(Catalogues, texts_name_the_buttons_by_their_labels)
{
    const struct {
        const char *text, *button;
    } cases[] = {{"IDS_KQ_POP_TAP_UPLOAD_TO_TRY_AGAIN", "IDS_KQ_BUTTON_UPLOAD"},
                 {"IDS_VELORA_STATE_EMPTY_TEXT", "IDS_TPLATFORM_ACBUTTON_DONE_ABB"}};
    std::ifstream languages(PO_DIR "/LINGUAS");
    for (std::string language; languages >> language;)
        for (const auto &c : cases)
            EXPECT_NE(translated(language, c.text).find(translated(language, c.button)), std::string::npos)
                << language << ' ' << c.text;
}

} // namespace
