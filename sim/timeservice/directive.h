// Directives: how the next requests under /tiktalwebs are answered (POST /_sim/next).
#pragma once

#include "protocol.h"

#include <string>

namespace timeservice {

struct Directive {
    long long count = 1;     // the requests it answers
    long long status = 0;    // 0: the normal status
    long long delayMs = 0;
    bool replaceBody = false;
    std::string body;
    std::string error;  // compact JSON of an object merged as "error"; empty for none
    bool wrapResult = false;
    long long repeat = 0;  // > 0: the body is `body` repeated so many times, streamed
    bool chunked = false;  // the body is streamed with chunked transfer encoding

    // The answer body is produced piece by piece while it is sent, not set whole.
    bool streams() const { return repeat > 0 || chunked; }
};

// Empty when the text is a valid directive, otherwise what is wrong with it.
std::string parseDirective(const std::string& text, Directive& directive);

// The answer text after the directive: a replacement body as it is; otherwise the normal answer,
// either with the directive's "error" member merged in, or, with "wrapResult", as the value of
// "result" exactly as it is printed unwrapped, with the "error" member beside it. A repeated body
// is not rendered here but streamed.
std::string render(Answer& normal, const Directive& directive);

}  // namespace timeservice
