// The command on a scripted hub that has the sensor's registry group, for tests of steps and of what they
// lead to.
#pragma once

#include "light/UdAlsCommand.h"
#include "light/UdAlsRecords.h"
#include "proto/sns_oem_als.pb.h"

class UdAlsSteps : public UdAlsCommand {
 protected:
  UdAlsSteps() {
    sns_registry_data group;
    addFloatItem(&group, "scale", 1, 3);
    script->registry[kGroup] = group;
  }

  void giveRecords(const std::vector<SampleData>& records) {
    std::string bytes;
    for (const SampleData& record : records) appendFloats(record, &bytes);
    give(kDataFile, bytes);
  }
  [[nodiscard]] std::vector<SampleData> records() const {
    std::vector<SampleData> read;
    EXPECT_EQ(readUdAlsRecords(folder.path() / kDataFile, &read), FileResult::kOk);
    return read;
  }
  [[nodiscard]] const sns_registry_data_item* stored(const std::string& name) const {
    for (const sns_registry_data_item& item : script->registry.at(kGroup).items()) {
      if (item.name() == name) return &item;
    }
    return nullptr;
  }
  [[nodiscard]] int writes() const { return script->countRequests(HubScript::registrySuid(), 513); }

  /// The clear level of each step of a scan.
  void readClearOfEachStep(const std::vector<float>& clear) {
    auto step = std::make_shared<std::size_t>(0);
    answers[7804] = [this, step](ScriptedHub& hub) {
      ++*step;
      hub.SendMessage(Milliseconds(10), messageOf({{7805, std::string("\x08\x01", 2)}}));
    };
    script->sensors[0].reading = [clear, step](int) {
      return std::vector<float>{50, clear.at(*step - 1), 0, 0, 0, 0, 3, 100};
    };
  }

  /// The delays that the requests asked for.
  [[nodiscard]] std::vector<float> delaysAsked() const {
    std::vector<float> delays;
    for (const sns_client_request_msg& request : script->requests) {
      if (request.msg_id() != 7804) continue;
      sns_oem_delay_calib_req asked;
      EXPECT_TRUE(asked.ParseFromString(request.request().payload()));
      delays.push_back(asked.delay_ms());
    }
    return delays;
  }
};
