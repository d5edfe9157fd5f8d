// What the tests of the FTP settings have in common: the journal lines of a "set", by the parts it is made
// of.
#ifndef VELT_TESTS_UNIT_FTP_JOURNAL_H
#define VELT_TESTS_UNIT_FTP_JOURNAL_H

#include "tests/support/handler_test.h"

#include <string>

namespace ftptest {

/// Entry functions for API versions that no table row has.
void getVersion0(VELT::APIRequest* request, VELT::APIResponse* response);
void setVersion0(VELT::APIRequest* request, VELT::APIResponse* response);
void getVersion4(VELT::APIRequest* request, VELT::APIResponse* response);
void setVersion4(VELT::APIRequest* request, VELT::APIResponse* response);

/// A line of the system log that the FTP handler writes.
std::string log(const std::string& message, const std::string& arguments = "");

using ::operator+;

/// The lines and one more.
Lines operator+(Lines first, const std::string& line);

/// Parameters with both services off and `more` (`"key":value`, by commas), or with the given switches.
std::string request(const std::string& more = "", bool ftp = false, bool ftps = false);

/// The first calls of a "set" that passed its check: the services and the record are read. The record's bits
/// do not matter here, only what the service controller says.
Lines reads(bool ftpdEnabled = false);

/// The end of a "set" that found nothing to apply.
Lines nothingToApply();

std::string readsAddress();

/// The store of the record, with the fields that differ.
std::string stores(const std::string& differences);

/// The announcement of one service action with the given map of the run.
Lines announces(int map, const std::string& service, const std::string& action);

/// The five calls that stop the services, of which the first `count`.
Lines stopCalls(int count = 5);

/// All services are stopped, and that is announced with map1 and map2.
Lines stops();

/// Plain FTP, FTPS or both are started and that is announced, beginning with map3.
Lines startsPlain();
Lines startsTls();
Lines startsBoth();

/// One entry of the administrator log.
std::string entry(const std::string& event, const std::string& arg1 = "", const std::string& arg2 = "");

/// A whole "set" with both services off before and after: `steps` are the calls from the reading of the
/// record to its store, `differences` the fields that the store changes.
Lines applied(const Lines& steps, const std::string& differences, bool reloadsFirewall = false);

/// Puts the text of a control port, of at most 7 bytes, into a record.
void setPort(_tag_VELT_FTP_CONF_& conf, const char* text);

/// The frame of these tests.
class FTPTest : public HandlerTest {
protected:
    static constexpr const char* useUtf8Get = "VELTFTPUseUTF8Get()";
};

} // namespace ftptest

#endif
