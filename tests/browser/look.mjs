// SPDX-License-Identifier: Apache-2.0
// Screenshots for people to look at: node look.mjs BUILD_FOLDER [width…]. Every kind of item at four widths, by day and by
// night, with the system's colours, from right to left, and on a phone that lies on its side.
import {mkdirSync} from 'node:fs';
import {join} from 'node:path';
import {fileUrl, launch, openPage} from './browser.mjs';
import {Fixtures} from './fixtures.mjs';

const kItems = ['movie', 'lecture', 'audio', 'montage', 'document', 'image', 'web', 'commented', 'explained'];
const [folder, ...asked] = process.argv.slice(2);
const widths = asked.length ? asked.map(Number) : [320, 768, 1280, 1920];
const shots = join(folder, 'screenshots');
mkdirSync(shots, {recursive: true});
const course = new Fixtures(folder).course();
const heightOf = (width) => (width < 500 ? 640 : width < 1000 ? 1024 : Math.round(width * 0.6));
const looks = [
  ...widths.flatMap((width) =>
    ['light', 'dark'].map((colorScheme) => ({
      name: `${width}-${colorScheme}`,
      options: {viewport: {width, height: heightOf(width)}, colorScheme},
    })),
  ),
  {name: 'forced', options: {forcedColors: 'active'}},
  {name: 'arabic', options: {locale: 'ar-EG'}},
  {name: 'lying-phone', options: {viewport: {width: 640, height: 360}, hasTouch: true}},
];
const browser = await launch();
for (const {name, options} of looks) {
  const {context, page, complaints} = await openPage(browser, options);
  const shoot = async (item, hash) => {
    await page.goto('about:blank');
    await page.goto(fileUrl(course.folder, hash));
    await page.waitForTimeout(500);
    await page.screenshot({path: join(shots, `look-${name}-${item}.png`)});
  };
  await shoot('home', '');
  for (const [i, item] of kItems.entries()) await shoot(item, `#item=${course.items[i]}`);
  if (complaints.length) console.log(name, complaints);
  await context.close();
}
await browser.close();
