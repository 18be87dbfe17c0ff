#include "DialogTestSupport.h"

#include "dialogs/ClientOptionsDialog.h"
#include "dialogs/ServerOptionsDialog.h"
#include "localisation/ResourceStrings.h"
#include "localisation/UiLanguageScope.h"

#include <gtest/gtest.h>

#include <functional>
#include <memory>
#include <vector>

namespace {

struct CaptionRow
{
    const char *control; // empty for the form itself
    int id;
    const char *english;
};

struct FormCase
{
    const char *formName;
    std::function<std::unique_ptr<QDialog>()> create;
    std::vector<CaptionRow> captions;
};

const FormCase kForms[] = {
    { "frmServerOptions", [] { return std::make_unique<ServerOptionsDialog>(); },
      {
          { "", 5019, "Server I/O Options" },
          { "chkMultiClients", 5020, "Allow multiple client connections" },
          { "Frame1", 5021, "Inbound TCP/IP data options" },
          { "OptionTCP_0", 5022, "Transmit inbound TCP/IP data from all clients out serial port" },
          { "OptionTCP_1", 5023, "Ignore inbound TCP/IP data from all clients" },
          { "OptionTCP_2", 5024, "Transmit inbound TCP/IP data from first connected client only" },
          { "Frame2", 5025, "Inbound serial data options" },
          { "OptionSerial_0", 5026, "Send inbound serial data to all TCP/IP clients" },
          { "OptionSerial_1", 5027, "Ignore inbound serial data" },
          { "OptionSerial_2", 5028, "Send inbound serial data to first connected client only" },
          { "Command1", 1207, "&OK" },
          { "Command2", 1208, "&Cancel" },
      } },
    { "frmClientOptions", [] { return std::make_unique<ClientOptionsDialog>(); },
      {
          { "", 5013, "Client I/O Options" },
          { "Frame1", 5014, "2-Way I/O options:" },
          { "Option1_0", 5015, "Allow complete 2-way I/O." },
          { "Option1_1", 5016, "Disable output to serial port." },
          { "Option1_2", 5017, "Disable output to TCP/IP port." },
          { "chkConnectOnVirtualPort", 5018, "Open TCP/IP port only when Virtual COM Port is open" },
          { "Command1", 1207, "&OK" },
          { "Command2", 1208, "&Cancel" },
      } },
};

const QWidget *element(const QWidget &form, const CaptionRow &row)
{
    return *row.control ? control<QWidget>(form, QString::fromLatin1(row.control)) : &form;
}

// The title of the form, the caption of a button, check box, option button
// or frame.
QString captionOf(const QWidget &form, const CaptionRow &row)
{
    const QWidget *widget = element(form, row);
    if (widget == &form)
        return form.windowTitle();
    if (auto *button = qobject_cast<const QAbstractButton *>(widget))
        return button->text();
    if (auto *frame = qobject_cast<const QGroupBox *>(widget))
        return frame->title();
    ADD_FAILURE() << row.control << " has no caption";
    return {};
}

TEST(IOOptionsFormsTest, ModalFormsWithCaptionsFromTheirTagsInEitherLanguage)
{
    TransferScope transfer;
    for (const FormCase &form : kForms) {
        SCOPED_TRACE(form.formName);
        {
            UiLanguageScope english(UiLanguage::English);
            const std::unique_ptr<QDialog> dialog = form.create();
            EXPECT_EQ(dialog->objectName(), QString::fromLatin1(form.formName));
            EXPECT_TRUE(dialog->isModal());
            EXPECT_EQ(dialog->windowModality(), Qt::ApplicationModal);
            for (const CaptionRow &row : form.captions) {
                SCOPED_TRACE(row.id);
                const QWidget *widget = element(*dialog, row);
                ASSERT_NE(widget, nullptr);
                EXPECT_EQ(widget->property("tag").toString(), QString::number(row.id));
                EXPECT_EQ(captionOf(*dialog, row), QString::fromUtf8(row.english));
            }
        }
        {
            UiLanguageScope japanese(UiLanguage::Japanese);
            const std::unique_ptr<QDialog> dialog = form.create();
            for (const CaptionRow &row : form.captions) {
                SCOPED_TRACE(row.id);
                EXPECT_EQ(captionOf(*dialog, row), LoadResString(row.id));
            }
            EXPECT_NE(dialog->windowTitle(), QString::fromUtf8(form.captions.front().english));
            EXPECT_EQ(dialog->font().family(), LoadResString(20));
        }
    }
}

} // namespace
