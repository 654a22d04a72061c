// Link aggregation groups. The library fills the records; see the query for who frees them.

%record(VSLAGStatus)
%record(VSLAGTable)

%{
#include "vswitch/lags.h"
%}
%volatile_field(VSLAGStatus::id, lag_number)
%include "vswitch/lags.h"
