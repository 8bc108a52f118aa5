#pragma once
// What the pages say, in six languages.
#include <string>

enum class Language { EN, DE, FR, ES, KO, ZH };

enum class Text {
    SIGN_IN,
    SIGN_IN_FOR, // %1: the device
    SIGN_IN_FOR_UNNAMED,
    EMAIL,
    PASSWORD,
    CANCEL,
    NO_ACCOUNT,
    CREATE_ACCOUNT,
    HAVE_ACCOUNT,
    WRONG_PASSWORD,
    NEED_EMAIL,
    NEED_PASSWORD,
    WAIT_SECONDS, // %1: how many
    WAIT_MINUTES, // %1: how many
    APPROVE_TITLE,
    DEVICE,
    ACCOUNT_NAME,
    APPROVE_WHAT,
    APPROVE_WARNING,
    OTHER_NETWORK,
    ALLOW,
    DECLINE,
    NOT_YOU,
    GONE_TITLE,
    GONE_TEXT,
    CALLBACK_TITLE,
    CALLBACK_TEXT,
    PASSWORD_RULE,
    BAD_EMAIL,
    PASSWORD_SHORT,
    PASSWORD_LONG,
    PASSWORD_LIKE_EMAIL,
    PASSWORD_COMMON,
    TAKEN,
    SIGN_IN_INSTEAD,
    CLOSED_TITLE,
    CLOSED_TEXT,
    FORM_TITLE,
    FORM_TEXT,
    OPEN_AGAIN,
    FAILED_TITLE,
    FAILED_TEXT,
    COMPLETE_TITLE,
    COMPLETE_TEXT,
    DECLINED_TITLE,
    DECLINED_TEXT,
    ACCOUNT,
    STORAGE,
    USED_OF, // %1, %2: sizes
    DEVICES,
    NO_DEVICES,
    SINCE,     // %1: a date
    LAST_USED, // %1: a date and time
    NEVER_USED,
    SIGN_OUT,
    SIGN_OUT_HERE,
    UNNAMED_DEVICE,
    TERMS,
    TERMS_WHO,
    TERMS_FILES,
    TERMS_USE,
    TERMS_WARRANTY,
    MISSING_TITLE,
    MISSING_TEXT,
    TO_ACCOUNT,
    DATE,  // for strftime
    POINT, // of decimals
    COUNT
};

const char *text_of(Text text, Language language);
// The language by its name for browsers, such as "zh-CN", and for our own addresses, such as "zh_CN".
const char *language_tag(Language language);
const char *language_name(Language language);
// Reads a name such as de, de_DE or zh-Hans-CN. False when it is none of ours.
bool read_language(const std::string &name, Language &language);
// The language of ours that an Accept-Language header (null is allowed) likes best; English when there is none.
Language accepted_language(const char *header);
