// Text for staff pages: everything that comes from outside passes html() on its way into a page.
#pragma once

#include <cstdint>
#include <string>

// The text with the characters that mean something in HTML replaced; bytes that are no UTF-8 become U+FFFD.
std::string html(const std::string &text);

// A <time> element in the desk's own time zone.
std::string html_time(int64_t ms);

// "1.4 MB"
std::string size_text(int64_t bytes);

// "Submitted", "In process" …; "Status 9" for a number that is not known.
std::string status_text(int status);

// A whole page. `form_secret` empty: nobody is signed in, so the bar has no sign-out button.
std::string html_page(const std::string &title, const std::string &form_secret, const std::string &body);

// The hidden field that every form of a session carries.
std::string secret_field(const std::string &form_secret);
