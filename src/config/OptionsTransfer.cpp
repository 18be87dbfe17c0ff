#include "OptionsTransfer.h"

OptionsTransfer &OptionsTransfer::global()
{
    static OptionsTransfer transfer;
    return transfer;
}
