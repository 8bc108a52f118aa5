#pragma once
// Numbers as the language of the words writes them. Any thread.
#include <string>

// `value` with so many decimals (0 to 9) behind the language's sign. That is the one of the catalogues: the process's
// own numbers may be in another locale, for the language's need not be installed.
std::string _velora_common_number(double value, int decimals);
