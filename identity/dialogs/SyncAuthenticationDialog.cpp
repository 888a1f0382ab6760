#include "identity/dialogs/SyncAuthenticationDialog.h"

#include <boost/make_shared.hpp>
#include <boost/weak_ptr.hpp>

#include "foundation/core/ThrowError.h"
#include "foundation/ui/GridLayout.h"
#include "foundation/ui/LayoutJoiner.h"
#include "foundation/ui/UI_NodeLayouts.h"
#include "foundation/ui/UI_NodeManager.h"
#include "identity/dialogs/MessageBoxCallbackHandler.h"

namespace tolmonetsync {

using namespace tolmoui;

namespace {

const int kButtons = UI_MessageBox::kMessageBoxButton_OK | UI_MessageBox::kMessageBoxButton_Cancel;  // 0x801
const int kPasswordEditFlags = kTextEditFlag_Password;                                               // 0x20

const char kInvalidTypeConversion[] = "$$$/tolmocore/utility/Error/InvalidTypeConversion=Invalid type conversion.";

// Controls keep their handlers for as long as they live, which a caller's
// reference may make longer than the run: they reach the handler weakly.
// The adapter takes any message and checks that it is the handler's kind.
template <class Message>
boost::function<void(const Message*)> Bind(const boost::shared_ptr<MessageBoxCallbackHandler>& handler,
                                           void (MessageBoxCallbackHandler::*member)(const Message*))
{
    boost::weak_ptr<MessageBoxCallbackHandler> weak(handler);
    return [weak, member](const tolmoui::ConstMessage* message) {
        const Message* typed =
            tolmocore::utility::NonOptionalDynamicCast<const Message>(message, kInvalidTypeConversion, 105, 21);
        if (auto alive = weak.lock()) ((*alive).*member)(typed);
    };
}

boost::intrusive_ptr<UI_StaticText> MakeLabel(UI_Container& content, const char* nodeID, const UTF16String& text)
{
    boost::intrusive_ptr<UI_StaticText> label(new UI_StaticText(text));
    label->UI_SetNodeID(nodeID);
    content.ChildPushBack(label);
    return label;
}

boost::intrusive_ptr<UI_TextEdit> MakeEdit(UI_Container& content, const char* nodeID, int flags,
                                           const UTF16String& value)
{
    boost::intrusive_ptr<UI_TextEdit> edit(new UI_TextEdit(flags, 0));
    edit->UI_SetNodeID(nodeID);
    content.ChildPushBack(edit);
    edit->SetValue(value, false);
    return edit;
}

boost::intrusive_ptr<UI_HotTextButton> MakeLink(UI_Container& content, const char* nodeID, const UTF16String& text)
{
    if (text.empty()) return nullptr;
    boost::intrusive_ptr<UI_HotTextButton> link(new UI_HotTextButton());
    link->UI_SetNodeID(nodeID);
    link->SetText(text);
    content.ChildPushBack(link);
    return link;
}

// One row of the grid: label, edit and, if there is one, link.
void FillRow(GridLayout& grid, int row, const boost::intrusive_ptr<UI_StaticText>& label,
             const boost::intrusive_ptr<UI_TextEdit>& edit, const boost::intrusive_ptr<UI_HotTextButton>& link)
{
    const float kRowSpacing = UI_MessageBox::kRowSpacingAboveAndBelow;
    grid.SetCell(row, 0, boost::make_shared<UI_TextLayout>(label, PointT<float>{200, 0}, LayoutAlign_Center));
    grid.SetCell(row, 1,
                 boost::make_shared<SpacerOnTheLeft>(
                     4, boost::make_shared<UI_NodeLayout>(edit, PointT<float>{200, 20}, LayoutAlign_Center),
                     LayoutAlign_Center));
    if (link) {
        grid.SetCell(
            row, 2,
            boost::make_shared<SpacerOnTheRight>(kRowSpacing, boost::make_shared<UI_HotTextButtonLayout>(
                                                                  link, PointT<float>{0, 20}, LayoutAlign_Center)));
    }
}

void LayOut(UI_MessageBox& box, const MessageBoxCallbackHandler& handler,
            const boost::intrusive_ptr<UI_StaticText>& userNameLabel,
            const boost::intrusive_ptr<UI_StaticText>& passwordLabel)
{
    const float kRowSpacing = UI_MessageBox::kRowSpacingAboveAndBelow;
    LayoutDecorator& decorator = box.GetPreButtonLayoutDecorator();
    decorator.AddLayout(boost::make_shared<SpacerOnTheBottom>(kRowSpacing));

    const int columns = (handler.userNameLink || handler.passwordLink) ? 3 : 2;
    auto grid = boost::make_shared<GridLayout>(2, columns, kRowSpacing, 5);
    FillRow(*grid, 0, userNameLabel, handler.userNameEdit, handler.userNameLink);
    FillRow(*grid, 1, passwordLabel, handler.passwordEdit, handler.passwordLink);

    decorator.AddLayout(boost::make_shared<LayoutJoiner>(grid, LayoutPtr(), LayoutPlacement_BelowDO, ExtraSpace_Pass));
}

}  // namespace

bool SyncAuthenticationDialog(const SupplierInterface* supplier, const UTF16String& title, const UTF16String& message,
                              const UTF16String& userNameLabel, UTF16String& userName, const UTF16String& passwordLabel,
                              UTF16String& password, const boost::shared_ptr<SyncAuthenticationValidator>& validator,
                              UI_Node* parent, float width, float height,
                              const boost::shared_ptr<UI_MessageBox::MessageCallback>& messageCallback,
                              const UTF16String& userNameLinkText, const UTF16String& userNameLinkURL,
                              const UTF16String& passwordLinkText, const UTF16String& passwordLinkURL)
{
    boost::intrusive_ptr<UI_MessageBox> box(new UI_MessageBox(supplier, title, message, kButtons, kDialogResponse_OK,
                                                              messageCallback ? 0 : 3, parent, 0, width, height,
                                                              messageCallback));
    box->GetMessageStaticText()->SetIsMultiline(true);

    UI_Container& content = *box->GetContentContainer();
    auto passwordStatic = MakeLabel(content, "PasswordStaticText", passwordLabel);
    auto passwordEdit = MakeEdit(content, "PasswordTextEdit", kPasswordEditFlags, password);
    auto userNameStatic = MakeLabel(content, "UserNameStaticText", userNameLabel);
    auto userNameEdit = MakeEdit(content, "UserNameTextEdit", 0, userName);
    auto userNameLink = MakeLink(content, "UserNameLinkHotTextButton", userNameLinkText);
    auto passwordLink = MakeLink(content, "PasswordLinkHotTextButton", passwordLinkText);

    auto handler = boost::make_shared<MessageBoxCallbackHandler>();
    handler->dialog = box;
    handler->userNameEdit = userNameEdit;
    handler->passwordEdit = passwordEdit;
    handler->message = message;
    handler->userNameLink = userNameLink;
    handler->userNameLinkURL = userNameLinkURL;
    handler->passwordLink = passwordLink;
    handler->passwordLinkURL = passwordLinkURL;
    handler->validator = validator;
    handler->okButton = box->GetSpecificButton(kDialogResponse_OK);
    handler->messageText = box->GetMessageStaticText();

    boost::weak_ptr<MessageBoxCallbackHandler> weakHandler(handler);
    box->SetOkHook([weakHandler] {
        auto alive = weakHandler.lock();
        return alive && alive->ValidateOK();
    });
    box->SetOkButton(handler->okButton);
    if (userNameEdit->GetValue().empty() || passwordEdit->GetValue().empty()) handler->okButton->SetDisabled(true);

    userNameEdit->NotifyWhenChangedInteractively(Bind(handler, &MessageBoxCallbackHandler::UserNameTextEditChanged));
    passwordEdit->NotifyWhenChangedInteractively(Bind(handler, &MessageBoxCallbackHandler::PasswordTextEditChanged));
    if (userNameLink) userNameLink->NotifyWhenChanged(Bind(handler, &MessageBoxCallbackHandler::UserNameLinkChanged));
    if (passwordLink) passwordLink->NotifyWhenChanged(Bind(handler, &MessageBoxCallbackHandler::PasswordLinkChanged));

    LayOut(*box, *handler, userNameStatic, passwordStatic);

    int response;
    {
        UI_NodeManager::SetModalWindow modalScope(nullptr);
        box->UI_Show(true);
        userNameEdit->SelectAll();
        box->RunModal();
        // Written back however the dialog ended, Cancel included.
        userName = userNameEdit->GetValue();
        password = passwordEdit->GetValue();
        response = box->GetResponse();
    }
    return response == kDialogResponse_OK;
}

}  // namespace tolmonetsync
