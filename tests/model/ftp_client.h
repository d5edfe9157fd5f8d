// The model's user, by FTP.
#ifndef VELT_TESTS_MODEL_FTP_CLIENT_H
#define VELT_TESTS_MODEL_FTP_CLIENT_H

#include "tests/model/client.h"
#include "tests/model/policy.h"

namespace velt::model {

std::unique_ptr<Client> logInByFtp(int port, const Account& account);

} // namespace velt::model

#endif
