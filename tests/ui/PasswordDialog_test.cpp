// The password dialog driven through its modal loop as a user would: what
// enables OK, what the validator's refusals show, what comes back, the links.

#include <gtest/gtest.h>

#include <atomic>

#include "DialogDriver.h"
#include "foundation/core/Strings.h"
#include "foundation/ui/GridLayout.h"
#include "foundation/ui/LayoutJoiner.h"
#include "foundation/ui/UI_NodeLayouts.h"
#include "foundation/ui/UI_NodeManager.h"

namespace {

using namespace uitest;
using tolmocore::utility::ToNarrow;

std::string N(const UTF16String& text)
{
    return ToNarrow(text);
}

// Refuses with the texts given, one per call (the last one repeated), and
// remembers what it was asked.
struct RefusingValidator {
    std::vector<UTF16String> errors;
    std::vector<std::pair<UTF16String, UTF16String>> asked;  // written on the UI thread, read inside the loop

    boost::shared_ptr<SyncAuthenticationValidator> Make()
    {
        return Validator([this](const UTF16String& user, const UTF16String& password, UTF16String& error) {
            asked.emplace_back(user, password);
            error = errors[std::min(asked.size(), errors.size()) - 1];
            return false;
        });
    }
};

DialogArguments Filled()
{
    DialogArguments arguments;
    arguments.userName = UTF16String(u"ann");
    arguments.password = UTF16String(u"secret");
    return arguments;
}

class PasswordDialog : public ::testing::Test {};

TEST_F(PasswordDialog, ShowsTheFieldsWithTheStartingValuesInAModalScope)
{
    DialogArguments arguments = Filled();
    DialogRun run(arguments);
    ASSERT_TRUE(run.Do([](UI_MessageBox& box) {
        EXPECT_EQ(N(box.GetTitle()), "Sign in");
        EXPECT_EQ(N(MessageText(box)), "Sign in with your Halvane ID.");
        EXPECT_TRUE(box.GetMessageStaticText()->IsMultiline());
        EXPECT_EQ(box.GetButtonSet(), 0x801);
        EXPECT_TRUE(box.GetSpecificButton(kDialogResponse_OK)->IsDefault());
        EXPECT_EQ(box.GetIcon(), 3);  // no message callback
        EXPECT_EQ(box.GetOkButton(), box.GetSpecificButton(kDialogResponse_OK));
        EXPECT_EQ(UI_NodeManager::GetModalScopeDepth(), 1);
        EXPECT_EQ(UI_NodeManager::GetModalWindow(), nullptr);

        const auto userName = Edit(box, "UserNameTextEdit");
        const auto password = Edit(box, "PasswordTextEdit");
        ASSERT_TRUE(userName && password);
        EXPECT_EQ(N(userName->GetValue()), "ann");
        EXPECT_TRUE(userName->IsAllSelected());
        EXPECT_EQ(userName->GetFlags(), 0);
        EXPECT_EQ(N(password->GetValue()), "secret");
        EXPECT_EQ(password->GetFlags(), 0x20);
        EXPECT_EQ(N(box.FindDescendantAs<UI_StaticText>("UserNameStaticText")->GetValue()), "User name:");
        EXPECT_EQ(N(box.FindDescendantAs<UI_StaticText>("PasswordStaticText")->GetValue()), "Password:");
        EXPECT_FALSE(Link(box, "UserNameLinkHotTextButton"));
        EXPECT_FALSE(Link(box, "PasswordLinkHotTextButton"));
    }));
    EXPECT_TRUE(run.Do([](UI_MessageBox& box) { EXPECT_TRUE(box.HandleButtonClick(kDialogResponse_Cancel)); }));
    EXPECT_FALSE(run.Finish());
    EXPECT_EQ(UI_NodeManager::GetModalScopeDepth(), 0);
}

TEST_F(PasswordDialog, BothStartingValuesEnableOKAndAnAcceptingValidatorCloses)
{
    DialogArguments arguments = Filled();
    std::atomic<int> calls{0};
    arguments.validator = Validator([&](const UTF16String& user, const UTF16String& password, UTF16String&) {
        ++calls;
        return N(user) == "ann" && N(password) == "secret";
    });
    DialogRun run(arguments);
    ASSERT_TRUE(run.Do([](UI_MessageBox& box) {
        EXPECT_TRUE(OkEnabled(box));
        EXPECT_TRUE(box.HandleButtonClick(kDialogResponse_OK));
    }));
    EXPECT_TRUE(run.Finish());
    EXPECT_EQ(calls, 1);
    EXPECT_EQ(N(run.Arguments().userName), "ann");
    EXPECT_EQ(N(run.Arguments().password), "secret");
}

TEST_F(PasswordDialog, OneEmptyValueDisablesOKUntilBothHoldText)
{
    DialogArguments arguments;
    arguments.userName = UTF16String(u"ann");
    arguments.validator = Validator([](const UTF16String&, const UTF16String&, UTF16String&) { return true; });
    DialogRun run(arguments);
    ASSERT_TRUE(run.Do([](UI_MessageBox& box) {
        EXPECT_FALSE(OkEnabled(box));
        EXPECT_FALSE(box.HandleButtonClick(kDialogResponse_OK));  // cannot be pressed
        SimulateTyping(*Edit(box, "PasswordTextEdit"), UTF16String(u"s"));
        EXPECT_TRUE(OkEnabled(box));
        SimulateTyping(*Edit(box, "UserNameTextEdit"), UTF16String());
        EXPECT_FALSE(OkEnabled(box));
        SimulateTyping(*Edit(box, "UserNameTextEdit"), UTF16String(u"bob"));
        EXPECT_TRUE(OkEnabled(box));
        EXPECT_TRUE(box.HandleButtonClick(kDialogResponse_OK));
    }));
    EXPECT_TRUE(run.Finish());
    EXPECT_EQ(N(run.Arguments().userName), "bob");
    EXPECT_EQ(N(run.Arguments().password), "s");
}

TEST_F(PasswordDialog, ARefusalShowsItsErrorUntilTheUserTypesAndKeepsTheDialogOpen)
{
    RefusingValidator refusing{{UTF16String(u"first refusal"), UTF16String(u"second refusal")}, {}};
    DialogArguments arguments = Filled();
    arguments.validator = refusing.Make();
    DialogRun run(arguments);
    ASSERT_TRUE(run.Do([&](UI_MessageBox& box) {
        EXPECT_TRUE(box.HandleButtonClick(kDialogResponse_OK));
        EXPECT_EQ(N(MessageText(box)), "first refusal");
        ASSERT_EQ(refusing.asked.size(), 1u);
        EXPECT_EQ(N(refusing.asked[0].first), "ann");
        EXPECT_EQ(N(refusing.asked[0].second), "secret");
        // A second OK without a change keeps the first error.
        box.HandleButtonClick(kDialogResponse_OK);
        EXPECT_EQ(refusing.asked.size(), 2u);
        EXPECT_EQ(N(MessageText(box)), "first refusal");
        // A change that is not the user's edit leaves the error; typing puts the message back.
        Edit(box, "PasswordTextEdit")->HandleUserChange(kInteractiveChange_None);
        EXPECT_EQ(N(MessageText(box)), "first refusal");
        SimulateTyping(*Edit(box, "PasswordTextEdit"), UTF16String(u"secret2"));
        EXPECT_EQ(N(MessageText(box)), "Sign in with your Halvane ID.");
        // And the next refusal shows again, until the user name changes.
        box.HandleButtonClick(kDialogResponse_OK);
        EXPECT_EQ(N(MessageText(box)), "second refusal");
        SimulateTyping(*Edit(box, "UserNameTextEdit"), UTF16String(u"an"));
        EXPECT_EQ(N(MessageText(box)), "Sign in with your Halvane ID.");
    }));
    // Still open: the loop runs the next action.
    EXPECT_TRUE(run.Do([](UI_MessageBox& box) { EXPECT_TRUE(box.IsInModalLoop()); }));
}

TEST_F(PasswordDialog, ARefusalWithoutATextBlanksTheMessage)
{
    DialogArguments arguments = Filled();
    arguments.validator = Validator([](const UTF16String&, const UTF16String&, UTF16String&) { return false; });
    DialogRun run(arguments);
    ASSERT_TRUE(run.Do([](UI_MessageBox& box) {
        box.HandleButtonClick(kDialogResponse_OK);
        EXPECT_TRUE(MessageText(box).empty());
    }));
}

TEST_F(PasswordDialog, CancelAndTheCloseBoxReturnFalseWithTheTypedValues)
{
    for (const bool closeBox : {false, true}) {
        DialogArguments arguments = Filled();
        arguments.validator = Validator([](const UTF16String&, const UTF16String&, UTF16String&) { return true; });
        DialogRun run(arguments);
        ASSERT_TRUE(run.Do([&](UI_MessageBox& box) {
            SimulateTyping(*Edit(box, "UserNameTextEdit"), UTF16String(u"carla"));
            SimulateTyping(*Edit(box, "PasswordTextEdit"), UTF16String(u"hunter2"));
            if (closeBox)
                box.HandleCloseBox();
            else
                EXPECT_TRUE(box.HandleButtonClick(kDialogResponse_Cancel));
        }));
        EXPECT_FALSE(run.Finish()) << closeBox;
        EXPECT_EQ(N(run.Arguments().userName), "carla");
        EXPECT_EQ(N(run.Arguments().password), "hunter2");
    }
}

TEST_F(PasswordDialog, WithoutAValidatorOKNeverCloses)
{
    DialogArguments arguments = Filled();
    DialogRun run(arguments);
    ASSERT_TRUE(run.Do([](UI_MessageBox& box) {
        EXPECT_TRUE(OkEnabled(box));
        EXPECT_TRUE(box.HandleButtonClick(kDialogResponse_OK));
        EXPECT_TRUE(MessageText(box).empty());  // the empty error
        EXPECT_TRUE(box.HandleButtonClick(kDialogResponse_OK));
    }));
    ASSERT_TRUE(run.Do([](UI_MessageBox& box) {
        EXPECT_TRUE(box.IsInModalLoop());
        box.HandleButtonClick(kDialogResponse_Cancel);
    }));
    EXPECT_FALSE(run.Finish());
}

TEST_F(PasswordDialog, AMessageCallbackGoesToTheBoxAndChangesTheIcon)
{
    DialogArguments arguments = Filled();
    arguments.messageCallback.reset(new UI_MessageBox::MessageCallback([](ConstMessage*) {}));
    DialogRun run(arguments);
    ASSERT_TRUE(run.Do([&](UI_MessageBox& box) {
        EXPECT_EQ(box.GetIcon(), 0);
        EXPECT_EQ(box.GetMessageCallback(), arguments.messageCallback);
    }));
}

// --- layout and links ---

class PasswordDialogLayout : public ::testing::Test {
protected:
    // The grid the dialog handed to its box, checked on the way.
    static boost::shared_ptr<GridLayout> Grid(UI_MessageBox& box)
    {
        const auto& layouts = box.GetPreButtonLayoutDecorator().GetLayouts();
        EXPECT_EQ(layouts.size(), 2u);
        if (layouts.size() != 2) return nullptr;
        const auto spacer = boost::dynamic_pointer_cast<SpacerOnTheBottom>(layouts[0]);
        EXPECT_TRUE(spacer && !spacer->GetInner());
        const auto joiner = boost::dynamic_pointer_cast<LayoutJoiner>(layouts[1]);
        EXPECT_TRUE(joiner);
        if (!joiner) return nullptr;
        EXPECT_FALSE(joiner->GetSecond());
        EXPECT_EQ(joiner->GetPlacement(), LayoutPlacement_BelowDO);
        EXPECT_EQ(joiner->GetExtraSpace(), ExtraSpace_Pass);
        return boost::dynamic_pointer_cast<GridLayout>(joiner->GetFirst());
    }
    static UI_Node* NodeAt(const GridLayout& grid, int row, int column)
    {
        const LayoutPtr& cell = grid.GetCell(row, column);
        return cell ? cell->GetNode() : nullptr;
    }
};

TEST_F(PasswordDialogLayout, WithoutLinksTwoRowsOfLabelAndField)
{
    DialogRun run(Filled());
    ASSERT_TRUE(run.Do([](UI_MessageBox& box) {
        const auto grid = Grid(box);
        ASSERT_TRUE(grid);
        EXPECT_EQ(grid->GetRowCount(), 2);
        EXPECT_EQ(grid->GetColumnCount(), 2);
        EXPECT_EQ(NodeAt(*grid, 0, 0), box.FindDescendant("UserNameStaticText").get());
        EXPECT_EQ(NodeAt(*grid, 0, 1), Edit(box, "UserNameTextEdit").get());
        EXPECT_EQ(NodeAt(*grid, 1, 0), box.FindDescendant("PasswordStaticText").get());
        EXPECT_EQ(NodeAt(*grid, 1, 1), Edit(box, "PasswordTextEdit").get());
    }));
}

TEST_F(PasswordDialogLayout, OnlyAPasswordLinkGivesThreeColumnsWithTheFirstRowsThirdEmpty)
{
    DialogArguments arguments = Filled();
    arguments.passwordLinkText = UTF16String(u"Forgot your password?");
    arguments.passwordLinkURL = UTF16String(u"https://id.example.test/reset");
    DialogRun run(arguments);
    ASSERT_TRUE(run.Do([](UI_MessageBox& box) {
        const auto grid = Grid(box);
        ASSERT_TRUE(grid);
        EXPECT_EQ(grid->GetColumnCount(), 3);
        EXPECT_FALSE(grid->GetCell(0, 2));
        const auto link = Link(box, "PasswordLinkHotTextButton");
        ASSERT_TRUE(link);
        EXPECT_EQ(N(link->GetText()), "Forgot your password?");
        EXPECT_FALSE(Link(box, "UserNameLinkHotTextButton"));
        EXPECT_EQ(NodeAt(*grid, 1, 2), link.get());
    }));
}

TEST_F(PasswordDialogLayout, ALinkWithoutAURLOpensNothing)
{
    RecordingOpener opener;
    DialogArguments arguments = Filled();
    arguments.userNameLinkText = UTF16String(u"Create an account");
    DialogRun run(arguments);
    ASSERT_TRUE(run.Do([](UI_MessageBox& box) {
        const auto link = Link(box, "UserNameLinkHotTextButton");
        ASSERT_TRUE(link);
        EXPECT_TRUE(link->HandleUserChange(kInteractiveChange_Click));
        EXPECT_TRUE(box.IsInModalLoop());
    }));
    EXPECT_TRUE(opener.Opened().empty());
}

TEST_F(PasswordDialogLayout, ALinkWithAURLOpensItsOwnURL)
{
    RecordingOpener opener;
    DialogArguments arguments = Filled();
    arguments.userNameLinkText = UTF16String(u"Create an account");
    arguments.userNameLinkURL = UTF16String(u"id.example.test/new");
    arguments.passwordLinkText = UTF16String(u"Forgot your password?");
    arguments.passwordLinkURL = UTF16String(u"https://id.example.test/reset");
    DialogRun run(arguments);
    ASSERT_TRUE(run.Do([](UI_MessageBox& box) {
        Link(box, "PasswordLinkHotTextButton")->HandleUserChange(kInteractiveChange_Click);
    }));
    ASSERT_EQ(opener.Opened().size(), 1u);
    EXPECT_EQ(N(opener.Opened()[0]), "https://id.example.test/reset");
    ASSERT_TRUE(run.Do([](UI_MessageBox& box) {
        Link(box, "UserNameLinkHotTextButton")->HandleUserChange(kInteractiveChange_Click);
    }));
    ASSERT_EQ(opener.Opened().size(), 2u);
    EXPECT_EQ(N(opener.Opened()[1]), "http://id.example.test/new");
}

}  // namespace
