#pragma once
// How the service spells its answers. Every style reads back to the same
// assets in the client, so tests can prove the client takes each form.

namespace tolmonetsync {
namespace server {

enum IdForm {
    IdForm_Plain,    // "id": "abc"
    IdForm_Path,     // "id": "/collections/abc" or "/assets/abc"
    IdForm_ApiPath,  // "id": "/api/collections/abc" for collections; items as IdForm_Path
    IdForm_UrlOnly,  // no "id"; "url" as IdForm_ApiPath
};

enum HeaderCase {
    HeaderCase_Usual,  // ETag, Location, Last-Modified
    HeaderCase_Lower,
    HeaderCase_Upper,
};

struct AnswerStyle {
    IdForm mIdForm = IdForm_Plain;
    bool mAbsoluteLocation = false;  // "http://127.0.0.1:PORT/api/..." instead of "/api/..."
    HeaderCase mHeaderCase = HeaderCase_Usual;
    bool mSizeAsString = false;
    bool mFractionalSeconds = true;
};

}  // namespace server
}  // namespace tolmonetsync
