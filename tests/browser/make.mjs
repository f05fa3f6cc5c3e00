// SPDX-License-Identifier: Apache-2.0
// Makes the packages that the tests share: node make.mjs BUILD_FOLDER
import {Fixtures} from './fixtures.mjs';

new Fixtures(process.argv[2]).all();
