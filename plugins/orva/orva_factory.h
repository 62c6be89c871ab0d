#pragma once

namespace lumo {

class DataConnectionFactory;
struct FormatRecord;

/// The factory of the row "ORVA"; it lives until the process ends.
DataConnectionFactory* MakeOrvaFactory(FormatRecord& record);

}  // namespace lumo
