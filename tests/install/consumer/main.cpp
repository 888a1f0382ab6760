// Uses the installed headers and library the way a host would.
#include <tolmonetsync/tolmonetsync.h>

#include <iostream>

int main()
{
    const Guid id = Guid::CreateUnique();
    const auto response = tolmonetsync::MakeErrorResponse(u"installed package works");
    try {
        tolmonetsync::ThrowResponse(id, response);
    } catch (const tolmonetsync::RestException& e) {
        std::cout << e.what() << ' ' << (e.mRequestUID == id ? "same-id" : "other-id") << '\n';
        return e.mStatus == -100 ? 0 : 1;
    }
    return 1;
}
